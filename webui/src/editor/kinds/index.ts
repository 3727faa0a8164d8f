import { NoBuzzer } from '../../tasks/NoBuzzer';
import { BeepSettings } from './beep/BeepSettings';
import { beepExtra, beepForm, beepProblems } from './beep/model';
import { defineKind, type Kind } from './kind';
import { asEditableKind, type EditableKind } from './names';
import { OtherSettings } from './other/OtherSettings';
import { newRecycleForm, recycleExtra, recycleForm, recycleProblems } from './recycle/model';
import { RecycleSettings } from './recycle/RecycleSettings';
import { scriptExtra, scriptForm, scriptProblems } from './script/model';
import { ScriptSettings } from './script/ScriptSettings';
import { serviceExtra, serviceForm, serviceProblems } from './service/model';
import { ServiceSettings } from './service/ServiceSettings';

const KINDS: Record<EditableKind, Kind> = {
    beep: defineKind({
        toForm: beepForm,
        toExtra: beepExtra,
        problems: beepProblems,
        Settings: BeepSettings,
        Remark: NoBuzzer,
    }),
    script: defineKind({
        toForm: scriptForm,
        toExtra: scriptExtra,
        problems: scriptProblems,
        Settings: ScriptSettings,
    }),
    recycle: defineKind({
        toForm: recycleForm,
        toNewForm: newRecycleForm,
        toExtra: recycleExtra,
        problems: recycleProblems,
        Settings: RecycleSettings,
    }),
    service: defineKind({
        toForm: serviceForm,
        toExtra: serviceExtra,
        problems: serviceProblems,
        Settings: ServiceSettings,
    }),
};

/** Tasks of other applications: what is theirs goes back as it came. */
const OTHER: Kind = defineKind({
    toForm: (extra: unknown) => extra,
    toExtra: (extra: unknown) => extra,
    problems: () => ({}),
    Settings: OtherSettings,
});

export function kindOf(type: string): Kind {
    const kind = asEditableKind(type);
    return kind === null ? OTHER : KINDS[kind];
}
