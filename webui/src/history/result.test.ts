import { describe, expect, it } from 'vitest';

import type { Run } from '../api/history';
import en from '../texts/en.json';
import { makeTranslate } from '../texts/translate';
import { outcomeOf, reasonText, resultText, runLength, whyText } from './result';

const t = makeTranslate(en, 'en');

const RUN: Run = {
    run: 12,
    task: 3,
    name: 'Lunch signal',
    reason: 'schedule',
    state: 'ended',
    why: '',
    asked_program: '',
    asked_account: '',
    occurrence: '2026-11-21T11:00:00.000Z',
    queued: '2026-11-21T11:00:00.010Z',
    started: '2026-11-21T11:00:00.100Z',
    ended: '2026-11-21T11:00:02.350Z',
    exit_status: 0,
    signal: null,
    output: 0,
};

function told(part: Partial<Run>): string {
    return resultText({ ...RUN, ...part }, t);
}

describe('the result of a run', () => {
    it('is what a person makes of its ending', () => {
        expect(told({})).toBe('Succeeded');
        expect(told({ exit_status: 2 })).toBe('Failed (exit status 2)');
        expect(told({ exit_status: null, signal: 15 })).toBe('Ended by signal 15');
        expect(told({ exit_status: null, started: null })).toBe('Could not start');
        expect(told({ state: 'skipped', exit_status: null })).toBe('Skipped');
        expect(told({ state: 'lost', exit_status: null })).toBe('Outcome unknown');
        expect(outcomeOf({ ...RUN, state: 'running', exit_status: null })).toBe('running');
    });

    it('that a person stopped is no failure, whatever the command made of it', () => {
        const stopped = { why: 'stopped', exit_status: null, signal: 15 };
        expect(outcomeOf({ ...RUN, ...stopped })).toBe('stopped');
        expect(told(stopped)).toBe('Stopped by hand');
        expect(told({ ...stopped, signal: 9 })).toBe('Stopped by hand');
        expect(told({ ...stopped, signal: null, exit_status: 143 })).toBe('Stopped by hand');
        const waiting = { ...stopped, state: 'skipped', signal: null, started: null } as const;
        expect(outcomeOf({ ...RUN, ...waiting })).toBe('stopped');
        expect(told(waiting)).toBe('Stopped before it started');
        expect(outcomeOf({ ...RUN, ...stopped, state: 'running', signal: null })).toBe('running');
    });

    it('has a length once it has started, which grows while it runs', () => {
        const now = Date.parse('2026-11-21T11:00:10.100Z');
        expect(runLength(RUN, now)).toBe(2250);
        expect(runLength({ ...RUN, state: 'running', ended: null }, now)).toBe(10_000);
        expect(runLength({ ...RUN, state: 'lost', ended: null }, now)).toBeNull();
        expect(runLength({ ...RUN, state: 'skipped', started: null, ended: null }, now)).toBeNull();
    });
});

describe('the reason that the scheduler gives', () => {
    it('is not repeated beside a result that says it already', () => {
        const run = { ...RUN, state: 'skipped', exit_status: null } as const;
        expect(reasonText({ ...run, why: 'overlap' }, t)).toBe('The run before was not over yet');
        expect(reasonText({ ...run, why: 'stopped' }, t)).toBe('');
        expect(reasonText(RUN, t)).toBe('');
    });

    it('is told in the language of the page where it is a known one', () => {
        expect(whyText('overlap', t)).toBe('The run before was not over yet');
        expect(whyText('cannot start a shell: No such file', t)).toBe(
            'The shell could not be started (No such file)',
        );
        expect(whyText('the owner cannot be looked up: Input/output error', t)).toBe(
            'The owner could not be looked up (Input/output error)',
        );
        expect(whyText('something new', t)).toBe('something new');
    });
});
