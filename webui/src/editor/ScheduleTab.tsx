import {
    Button,
    Checkbox,
    FormSelect,
    FormSelectOption,
    Radio,
    TextInput,
    ToggleGroup,
    ToggleGroupItem,
} from '@patternfly/react-core';

import { REPEATS, type Repeat } from '../api/tasks';
import { useTexts } from '../texts/TextsProvider';
import { ClockField } from './ClockField';
import { ComingStarts } from './ComingStarts';
import { Field } from './fields';
import { fieldId } from './problems';
import { isDate, type ScheduleForm } from './schedule';
import { usesLastDay } from './scheduleWords';

interface Props {
    form: ScheduleForm;
    hasProblems: boolean;
    onChange(part: Partial<ScheduleForm>): void;
    onRefused(message: string | null): void;
}

type PartProps = Pick<Props, 'form' | 'onChange'>;

const FROM_MONDAY = [1, 2, 3, 4, 5, 6, 0];
const ALL = Array.from({ length: 7 }, () => true);
const WORK_DAYS = ALL.map((_, day) => day >= 1 && day <= 5);

function WeekDays({ form, onChange }: PartProps) {
    const { t, format } = useTexts();
    const toggle = (day: number, on: boolean) =>
        onChange({ days: form.days.map((old, each) => (each === day ? on : old)) });
    return (
        <Field field="schedule.days" label={t('schedule.days')} group isRequired>
            {({ id }) => (
                <>
                    <ToggleGroup aria-label={t('schedule.days')} id={id} className="orva-days">
                        {FROM_MONDAY.map((day) => (
                            <ToggleGroupItem
                                key={day}
                                text={format.weekDay(day, 'short')}
                                buttonId={`${id}-${day}`}
                                isSelected={form.days[day] ?? false}
                                onChange={(_event, on) => toggle(day, on)}
                            />
                        ))}
                    </ToggleGroup>
                    <div>
                        <Button variant="link" onClick={() => onChange({ days: ALL })}>
                            {t('words.everyDay')}
                        </Button>
                        <Button variant="link" onClick={() => onChange({ days: WORK_DAYS })}>
                            {t('words.workDays')}
                        </Button>
                    </div>
                </>
            )}
        </Field>
    );
}

function DateFields({ form, onChange }: PartProps) {
    const { t, format } = useTexts();
    return (
        <>
            {/* The browser's input orders day and month in its own way: the words say which is which. */}
            <Field
                field="schedule.date"
                label={t('schedule.date')}
                help={isDate(form.date) ? format.dateWithDay(form.date) : undefined}
                isRequired
            >
                {(input) => (
                    <TextInput
                        {...input}
                        type="date"
                        className="orva-short"
                        min="1970-01-01"
                        value={form.date}
                        onChange={(_event, date) => onChange({ date })}
                    />
                )}
            </Field>
            <Field
                field="schedule.repeat"
                label={t('schedule.repeat')}
                help={usesLastDay(form) ? t('schedule.lastDay') : undefined}
            >
                {({ id, ...input }) => (
                    <FormSelect
                        id={id}
                        aria-describedby={input['aria-describedby']}
                        className="orva-short"
                        value={form.repeat}
                        onChange={(_event, repeat) => onChange({ repeat: repeat as Repeat })}
                    >
                        {REPEATS.map((repeat) => (
                            <FormSelectOption
                                key={repeat}
                                value={repeat}
                                label={t(`repeat.${repeat}`)}
                            />
                        ))}
                    </FormSelect>
                )}
            </Field>
        </>
    );
}

function Interval({ form, onChange }: PartProps) {
    const { t } = useTexts();
    return (
        <>
            <Field field="schedule.every" label={t('schedule.every')} isRequired>
                {(input) => (
                    <div className="orva-row">
                        <TextInput
                            {...input}
                            className="orva-number"
                            inputMode="numeric"
                            autoComplete="off"
                            value={form.every}
                            onChange={(_event, every) => onChange({ every })}
                        />
                        <FormSelect
                            aria-label={t('schedule.unit')}
                            className="orva-number"
                            value={form.unit}
                            onChange={(_event, unit) =>
                                onChange({ unit: unit as ScheduleForm['unit'] })
                            }
                        >
                            <FormSelectOption value="minutes" label={t('schedule.minutes')} />
                            <FormSelectOption value="hours" label={t('schedule.hours')} />
                        </FormSelect>
                    </div>
                )}
            </Field>
            <ClockField
                field="schedule.last"
                label={t('schedule.last')}
                value={form.last}
                onChange={(last) => onChange({ last })}
            />
        </>
    );
}

export function ScheduleTab({ form, hasProblems, onChange, onRefused }: Props) {
    const { t } = useTexts();
    return (
        <div className="orva-schedule">
            <div className="orva-form">
                <Field field="schedule.mode" label={t('schedule.mode')} group>
                    {({ id }) => (
                        <>
                            <Radio
                                id={`${id}-weekly`}
                                name={id}
                                label={t('schedule.weekly')}
                                isChecked={form.mode === 'weekly'}
                                onChange={() => onChange({ mode: 'weekly' })}
                            />
                            <Radio
                                id={`${id}-date`}
                                name={id}
                                label={t('schedule.onDate')}
                                isChecked={form.mode === 'date'}
                                onChange={() => onChange({ mode: 'date' })}
                            />
                        </>
                    )}
                </Field>
                {form.mode === 'weekly' ? (
                    <WeekDays form={form} onChange={onChange} />
                ) : (
                    <DateFields form={form} onChange={onChange} />
                )}
                <ClockField
                    field="schedule.time"
                    label={t(form.often === 'once' ? 'schedule.time' : 'schedule.first')}
                    value={form.time}
                    onChange={(time) => onChange({ time })}
                />
                <Checkbox
                    id={fieldId('schedule.often')}
                    label={t('schedule.again')}
                    isChecked={form.often === 'interval'}
                    onChange={(_event, on) => onChange({ often: on ? 'interval' : 'once' })}
                />
                {form.often === 'interval' && <Interval form={form} onChange={onChange} />}
                <Checkbox
                    id={fieldId('schedule.runMissed')}
                    label={t('schedule.runMissed')}
                    description={t('schedule.runMissedHelp')}
                    isChecked={form.runMissed}
                    onChange={(_event, runMissed) => onChange({ runMissed })}
                />
            </div>
            <ComingStarts form={form} hasProblems={hasProblems} onRefused={onRefused} />
        </div>
    );
}
