import { collect, type Problems } from '../../problems';

export interface ScriptForm {
    script: string;
}

export function scriptForm(extra: unknown): ScriptForm {
    const script = (extra as { script?: unknown } | null)?.script;
    return { script: typeof script === 'string' ? script : '' };
}

export function scriptExtra(form: ScriptForm): unknown {
    return { script: form.script };
}

export function scriptProblems({ script }: ScriptForm): Problems {
    return collect({
        'extra.script':
            script.trim() === ''
                ? { key: 'problem.script' }
                : script.includes('\0')
                  ? { key: 'problem.nul' }
                  : undefined,
    });
}
