import type { CleanRules } from '../../../api/appliance';
import { collect, numberProblem, type Problems, wholeNumber } from '../../problems';

export type Policy = 'time' | 'size' | 'clean_all';

export interface KeepSize {
    on: boolean;
    megabytes: string;
}

export interface RecycleForm {
    all: boolean;
    shares: string[];
    policy: Policy;
    days: string;
    megabytes: string;
    order: 'oldest' | 'largest';
    keepLarger: KeepSize;
    keepSmaller: KeepSize;
    keepExtensions: boolean;
    /** As typed: "pdf, docx". */
    extensions: string;
    /** Those of the document, which count while `extensions` still shows them. */
    storedExtensions: string[];
    /** Whether saving switches the bins of the chosen shares on. */
    switchOn: boolean;
}

export const MOST_DAYS = 36_500;
/** Larger ones wrap round to small ones in the command, which would empty the bin. */
export const MOST_MEGABYTES = 4095;
const MEGABYTE = 1_048_576;
const USUAL_DAYS = 30;
const USUAL_MEGABYTES = 100;
/** What a form asks for all shares, those of the accounts too. */
const EVERY_SHARE = 'all_include_home';
const CHOSEN_SHARES = 'select';

interface ReserveDocument {
    size_greater_check?: boolean;
    size_greater?: number;
    size_smaller_check?: boolean;
    size_smaller?: number;
    extension_check?: boolean;
    extension?: unknown;
}

interface RecycleDocument {
    clean_share_policy?: { clean_all?: boolean; shares?: string[] | null };
    clean_file_policy?: {
        policy?: string;
        size?: number;
        sort_type?: number;
        time?: number;
        reserve_policy?: ReserveDocument;
    };
}

export function recycleForm(extra: unknown): RecycleForm {
    const document = (extra ?? {}) as RecycleDocument;
    const shares = document.clean_share_policy;
    const files = document.clean_file_policy;
    const keep = files?.reserve_policy;
    const extensions = extensionsOf(keep?.extension);
    return {
        all: shares?.clean_all ?? true,
        shares: shares?.shares ?? [],
        policy: files?.policy === 'time' || files?.policy === 'size' ? files.policy : 'clean_all',
        days: String(files?.time ?? USUAL_DAYS),
        megabytes: String(files?.size ?? USUAL_MEGABYTES),
        order: files?.sort_type === 0 ? 'largest' : 'oldest',
        keepLarger: keepSize(keep?.size_greater_check, keep?.size_greater),
        keepSmaller: keepSize(keep?.size_smaller_check, keep?.size_smaller),
        keepExtensions: keep?.extension_check === true,
        extensions: shownExtensions(extensions),
        storedExtensions: extensions,
        switchOn: false,
    };
}

/** The blank form means everything in all bins: too much for somebody who has only looked at it. */
export function newRecycleForm(extra: unknown): RecycleForm {
    return { ...recycleForm(extra), policy: 'time', days: String(USUAL_DAYS) };
}

function extensionsOf(stored: unknown): string[] {
    return (Array.isArray(stored) ? stored : [])
        .map((each: { file_ext?: unknown } | null) => each?.file_ext)
        .filter((text) => typeof text === 'string');
}

function shownExtensions(extensions: string[]): string {
    return extensions.join(', ');
}

function keepSize(on: boolean | undefined, megabytes: number | undefined): KeepSize {
    return { on: on === true, megabytes: String(megabytes ?? USUAL_MEGABYTES) };
}

/**
 * The extensions that are meant: the stored ones as they are, or those that were typed, without the
 * dots that people put before them.
 */
export function extensionList(form: RecycleForm): string[] {
    if (form.extensions === shownExtensions(form.storedExtensions)) {
        return form.storedExtensions;
    }
    const words = form.extensions.split(/[\s,;]+/).map((word) => word.replace(/^\*?\./, ''));
    return [...new Set(words.filter(Boolean))];
}

function number(text: string, most: number): number | undefined {
    return wholeNumber(text, 1, most) ?? undefined;
}

export function recycleExtra(form: RecycleForm): unknown {
    const size = form.policy === 'size';
    return {
        clean_share_policy: { clean_all: form.all, shares: form.all ? [] : form.shares },
        clean_file_policy: {
            policy: form.policy,
            ...(form.policy === 'time' && { time: number(form.days, MOST_DAYS) }),
            ...(size && { size: number(form.megabytes, MOST_MEGABYTES) }),
            ...(size && { sort_type: form.order === 'oldest' ? 1 : 0 }),
            reserve_policy: {
                size_greater_check: form.keepLarger.on,
                ...(form.keepLarger.on && {
                    size_greater: number(form.keepLarger.megabytes, MOST_MEGABYTES),
                }),
                size_smaller_check: form.keepSmaller.on,
                ...(form.keepSmaller.on && {
                    size_smaller: number(form.keepSmaller.megabytes, MOST_MEGABYTES),
                }),
                extension_check: form.keepExtensions,
                ...(form.keepExtensions && {
                    extension: extensionList(form).map((word) => ({ file_ext: word })),
                }),
            },
        },
        ...(form.switchOn && { enableRecycle: form.all ? EVERY_SHARE : CHOSEN_SHARES }),
    };
}

function extensionsProblem(form: RecycleForm) {
    const words = extensionList(form);
    if (words.length === 0) {
        return { key: 'problem.noExtension' } as const;
    }
    // They stand in a command line as they are.
    const bad = words.find((word) => !/^[A-Za-z0-9_+-]+$/.test(word));
    return bad === undefined ? undefined : { key: 'problem.extension' as const, values: { bad } };
}

export function recycleProblems(form: RecycleForm): Problems {
    const size = (keep: KeepSize) =>
        keep.on ? numberProblem(keep.megabytes, 1, MOST_MEGABYTES) : undefined;
    return collect({
        'extra.shares':
            !form.all && form.shares.length === 0 ? { key: 'problem.shares' } : undefined,
        'extra.days': form.policy === 'time' ? numberProblem(form.days, 1, MOST_DAYS) : undefined,
        'extra.megabytes':
            form.policy === 'size' ? numberProblem(form.megabytes, 1, MOST_MEGABYTES) : undefined,
        'extra.keepLarger': size(form.keepLarger),
        'extra.keepSmaller': size(form.keepSmaller),
        'extra.extensions': form.keepExtensions ? extensionsProblem(form) : undefined,
    });
}

/** What the preview is asked for; for a form without problems. */
export function cleanRules(form: RecycleForm): CleanRules {
    const bytes = (megabytes: string) => Number(megabytes) * MEGABYTE;
    return {
        shares: form.all ? [] : form.shares,
        days: form.policy === 'time' ? Number(form.days) : null,
        bytes: form.policy === 'size' ? bytes(form.megabytes) : null,
        order: form.order,
        extensions: form.keepExtensions ? extensionList(form) : [],
        keep_larger: form.keepLarger.on ? bytes(form.keepLarger.megabytes) : null,
        keep_smaller: form.keepSmaller.on ? bytes(form.keepSmaller.megabytes) : null,
    };
}
