import { describe, expect, it } from 'vitest';

import { beepExtra, beepForm, beepProblems } from './beep/model';
import { scriptExtra, scriptForm, scriptProblems } from './script/model';
import { serviceExtra, serviceForm, serviceName, serviceProblems } from './service/model';

describe('the settings of a beep', () => {
    it('take the number of a stored task and the text of a blank form', () => {
        expect(beepForm({ beep_duration: 2 })).toEqual({ duration: '2' });
        expect(beepForm({ beep_duration: '60' })).toEqual({ duration: '60' });
        expect(beepForm(null)).toEqual({ duration: '60' });
    });

    it('send a number', () => {
        expect(beepExtra({ duration: ' 90 ' })).toEqual({ beep_duration: 90 });
    });

    it('allow 1 to 600 seconds', () => {
        const refused = {
            'extra.duration': { key: 'problem.number', values: { least: 1, most: 600 } },
        };
        expect(beepProblems({ duration: '1' })).toEqual({});
        expect(beepProblems({ duration: '600' })).toEqual({});
        for (const duration of ['', '0', '601', '-1', '1.5', '1e2', 'ten']) {
            expect(beepProblems({ duration })).toEqual(refused);
        }
    });
});

describe('the settings of a script', () => {
    it('are the text as it is', () => {
        expect(scriptForm({ script: 'df -h\n' })).toEqual({ script: 'df -h\n' });
        expect(scriptExtra({ script: 'df -h\n' })).toEqual({ script: 'df -h\n' });
        expect(scriptForm(null)).toEqual({ script: '' });
    });

    it('need a command', () => {
        expect(scriptProblems({ script: ' \n' })).toEqual({
            'extra.script': { key: 'problem.script' },
        });
        expect(scriptProblems({ script: 'a\0b' })).toEqual({
            'extra.script': { key: 'problem.nul' },
        });
        expect(scriptProblems({ script: 'true' })).toEqual({});
    });
});

describe('the settings of a service task', () => {
    const EXTRA = {
        action: 'start',
        services: [
            { type: 'service', id: 'Samba', name: 'Samba', enable: true },
            { type: 'package', id: 'note-server', name: 'Note Server', enable: false },
        ],
    };

    it('send the action and every choice', () => {
        expect(serviceExtra(serviceForm(EXTRA) as never)).toEqual({
            action: 'start',
            services: [
                { id: 'Samba', enable: true },
                { id: 'note-server', enable: false },
            ],
        });
    });

    it('need one choice', () => {
        const form = serviceForm(EXTRA);
        expect(serviceProblems(form)).toEqual({});
        const none = form.services.map((service) => ({ ...service, enable: false }));
        expect(serviceProblems({ ...form, services: none })).toEqual({
            'extra.services': { key: 'problem.services' },
        });
    });

    it('name built-in services as the appliance does, and packages by their own name', () => {
        const texts = (section: string, key: string) =>
            section === 'tree' && key === 'leaf_webdav' ? 'WebDAV' : null;
        const service = (type: 'service' | 'package', id: string, name: string) =>
            serviceName({ type, id, name, enable: false }, texts);
        expect(service('service', 'SecureWebDAV', 'SecureWebDAV')).toBe('WebDAV (HTTPS)');
        expect(service('service', 'Samba', 'Samba')).toBe('Samba');
        expect(service('package', 'SecureWebDAV', 'My package')).toBe('My package');
    });
});
