import { describe, expect, it } from 'vitest';

import { cleanRules, newRecycleForm, recycleExtra, recycleForm, recycleProblems } from './model';

/** What the API gives for a new task. */
const BLANK = {
    clean_file_policy: {
        policy: 'clean_all',
        reserve_policy: {
            extension_check: false,
            size_greater_check: false,
            size_smaller_check: false,
        },
    },
    clean_share_policy: { clean_all: true, shares: null },
};

const OLD_BINS = {
    clean_file_policy: {
        policy: 'time',
        time: 30,
        reserve_policy: {
            extension: [{ file_ext: 'pdf' }, { file_ext: 'docx' }],
            extension_check: true,
            size_greater_check: true,
            size_greater: 500,
            size_smaller_check: false,
        },
    },
    clean_share_policy: { clean_all: false, shares: ['documents', 'media'] },
};

const FULL_BINS = {
    clean_file_policy: {
        policy: 'size',
        size: 4095,
        sort_type: 0,
        reserve_policy: {
            extension_check: false,
            size_greater_check: false,
            size_smaller_check: true,
            size_smaller: 1,
        },
    },
    clean_share_policy: { clean_all: true, shares: [] },
};

describe('the settings of a recycle-bin task', () => {
    it('of a new task begin with what is old, so that one click does not empty all bins', () => {
        expect(newRecycleForm(BLANK)).toEqual({
            all: true,
            shares: [],
            policy: 'time',
            days: '30',
            megabytes: '100',
            order: 'oldest',
            keepLarger: { on: false, megabytes: '100' },
            keepSmaller: { on: false, megabytes: '100' },
            keepExtensions: false,
            extensions: '',
            storedExtensions: [],
            switchOn: false,
        });
        expect(recycleExtra(newRecycleForm(BLANK))).toMatchObject({
            clean_file_policy: { policy: 'time', time: 30 },
        });
    });

    it('of a stored task stay what they are', () => {
        const everything = { ...BLANK, clean_share_policy: { clean_all: true, shares: [] } };
        expect(recycleForm(everything).policy).toBe('clean_all');
        expect(recycleExtra(recycleForm(everything))).toEqual(everything);
    });

    it('come back unchanged', () => {
        expect(recycleExtra(recycleForm(OLD_BINS))).toEqual(OLD_BINS);
        expect(recycleExtra(recycleForm(FULL_BINS))).toEqual(FULL_BINS);
    });

    it('ask for the bins of the chosen shares, or of all, to be switched on', () => {
        const some = { ...recycleForm(OLD_BINS), switchOn: true };
        expect(recycleExtra(some)).toEqual({ ...OLD_BINS, enableRecycle: 'select' });
        const all = { ...recycleForm(FULL_BINS), switchOn: true };
        expect(recycleExtra(all)).toEqual({ ...FULL_BINS, enableRecycle: 'all_include_home' });
    });

    it('send extensions without the dots that were typed', () => {
        const form = { ...recycleForm(OLD_BINS), extensions: ' .PDF; *.tar, c++ PDF' };
        expect(recycleProblems(form)).toEqual({});
        expect(recycleExtra(form)).toMatchObject({
            clean_file_policy: {
                reserve_policy: {
                    extension: [{ file_ext: 'PDF' }, { file_ext: 'tar' }, { file_ext: 'c++' }],
                },
            },
        });
    });
});

describe('extensions that were stored by other means', () => {
    const stored = (...words: unknown[]) =>
        recycleForm({
            ...OLD_BINS,
            clean_file_policy: {
                ...OLD_BINS.clean_file_policy,
                reserve_policy: {
                    extension_check: true,
                    extension: words.map((file_ext) => ({ file_ext })),
                },
            },
        });
    const sent = (form: ReturnType<typeof recycleForm>) =>
        (recycleExtra(form) as typeof OLD_BINS).clean_file_policy.reserve_policy.extension.map(
            ({ file_ext }) => file_ext,
        );

    it('are neither split nor joined nor stripped while nobody changes them', () => {
        for (const words of [['a b', 'pdf'], ['.pdf'], ['pdf', 'pdf'], ['tar.gz', 'x,y']]) {
            expect(sent(stored(...words))).toEqual(words);
        }
    });

    it('are refused with the one that a command line would misread', () => {
        for (const bad of ['a b', '.pdf', 'x,y', 'a"b', '']) {
            expect(recycleProblems(stored('doc', bad))).toEqual({
                'extra.extensions': { key: 'problem.extension', values: { bad } },
            });
        }
    });

    it('are read as typed once they are changed', () => {
        const form = { ...stored('a b', '.pdf'), extensions: 'a, b, .pdf' };
        expect(sent(form)).toEqual(['a', 'b', 'pdf']);
        expect(recycleProblems(form)).toEqual({});
    });

    it('may be no list of texts at all', () => {
        const odd = (extension: unknown) =>
            recycleForm({ clean_file_policy: { reserve_policy: { extension_check: true, extension } } });
        for (const extension of [null, 'pdf', [null, {}, { file_ext: 7 }]]) {
            expect(odd(extension).extensions).toBe('');
            expect(recycleProblems(odd(extension))).toEqual({
                'extra.extensions': { key: 'problem.noExtension' },
            });
        }
    });
});

describe('what is refused in a recycle-bin task', () => {
    const OLD = recycleForm(OLD_BINS);
    const FULL = recycleForm(FULL_BINS);

    it('is a selection of no share', () => {
        expect(recycleProblems({ ...OLD, shares: [] })).toEqual({
            'extra.shares': { key: 'problem.shares' },
        });
        expect(recycleProblems({ ...OLD, shares: [], all: true })).toEqual({});
    });

    it('is an age of 0 days', () => {
        expect(recycleProblems({ ...OLD, days: '0' })).toEqual({
            'extra.days': { key: 'problem.number', values: { least: 1, most: 36500 } },
        });
    });

    it('is a size of 0, or one that would wrap round', () => {
        const refused = {
            'extra.megabytes': { key: 'problem.number', values: { least: 1, most: 4095 } },
        };
        for (const megabytes of ['0', '4096', '', '2.5']) {
            expect(recycleProblems({ ...FULL, megabytes })).toEqual(refused);
        }
    });

    it('is such a bound of the files to keep', () => {
        const keepSmaller = { on: true, megabytes: '4096' };
        expect(recycleProblems({ ...FULL, keepSmaller })).toHaveProperty(['extra.keepSmaller']);
        expect(recycleProblems({ ...FULL, keepSmaller: { ...keepSmaller, on: false } })).toEqual({});
    });

    it('is an extension that a command line would misread', () => {
        for (const bad of ['p$f', 'a"b', 'pdf`', 'tar.gz', 'ü']) {
            expect(recycleProblems({ ...OLD, extensions: `doc, ${bad}` })).toEqual({
                'extra.extensions': { key: 'problem.extension', values: { bad } },
            });
        }
        expect(recycleProblems({ ...OLD, extensions: ' , ' })).toEqual({
            'extra.extensions': { key: 'problem.noExtension' },
        });
    });
});

describe('the preview of a clean', () => {
    it('is asked for by the rules in bytes', () => {
        expect(cleanRules(recycleForm(OLD_BINS))).toEqual({
            shares: ['documents', 'media'],
            days: 30,
            bytes: null,
            order: 'oldest',
            extensions: ['pdf', 'docx'],
            keep_larger: 524288000,
            keep_smaller: null,
        });
        expect(cleanRules(recycleForm(FULL_BINS))).toEqual({
            shares: [],
            days: null,
            bytes: 4293918720,
            order: 'largest',
            extensions: [],
            keep_larger: null,
            keep_smaller: 1048576,
        });
    });
});
