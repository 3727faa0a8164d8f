import type { SettingsProps } from '../kind';
import { KeepFields } from './KeepFields';
import { type RecycleForm, recycleProblems } from './model';
import { PolicyField } from './PolicyField';
import { Preview } from './Preview';
import { SharesField } from './SharesField';

export function RecycleSettings(props: SettingsProps<RecycleForm>) {
    const incomplete = Object.keys(recycleProblems(props.form)).length > 0;
    return (
        <>
            <SharesField {...props} />
            <PolicyField {...props} />
            <KeepFields {...props} />
            <Preview form={props.form} disabled={incomplete} />
        </>
    );
}
