import { Checkbox, Switch } from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';

import type { Run } from '../api/history';
import type { SortKey, TaskRow } from '../api/tasks';
import { routeTo } from '../app/route';
import { useTexts } from '../texts/TextsProvider';
import type { TextKey } from '../texts/language';
import type { Action } from './actions';
import { KindLabel } from './kinds';
import { LastResult } from './LastResult';
import { RowMenu } from './RowMenu';
import type { Selection } from './useSelection';
import type { TaskView } from './view';

interface Column {
    sort: SortKey | null;
    title: TextKey;
    width?: 10 | 15 | 20 | 25 | 30;
}

export const COLUMNS: readonly Column[] = [
    { sort: 'enable', title: 'list.enabled' },
    { sort: 'id', title: 'list.id' },
    { sort: 'name', title: 'list.name', width: 20 },
    { sort: 'type', title: 'list.kind' },
    { sort: 'action', title: 'list.action', width: 25 },
    { sort: 'next_trigger_time', title: 'list.next' },
    { sort: null, title: 'list.last' },
];

export interface TaskTableProps {
    rows: TaskRow[];
    view: TaskView;
    latest: ReadonlyMap<number, Run>;
    selection: Selection;
    /** States that were asked for and not yet confirmed. */
    pending: ReadonlyMap<number, boolean>;
    onSort(sort: SortKey): void;
    onSwitch(row: TaskRow, enable: boolean): void;
    onAction(action: Action, row: TaskRow): void;
}

function NextStart({ text }: { text: string }) {
    const { format } = useTexts();
    if (text === '-') {
        return '–';
    }
    const [day, time] = format.localParts(text);
    return (
        <div>
            <span className="orva-nowrap">{day}</span>{' '}
            <span className="orva-nowrap">{time}</span>
        </div>
    );
}

function RowCells(props: TaskTableProps & { row: TaskRow }) {
    const { row, selection, pending, latest, onSwitch, onAction } = props;
    const { t } = useTexts();
    const label = (key: TextKey) => ({ dataLabel: t(key) });
    return (
        <Tr isRowSelected={selection.has(row.id)}>
            <Td className="pf-v6-c-table__check">
                <Checkbox
                    id={`select-${row.id}`}
                    aria-label={t('list.select', { name: row.name })}
                    isChecked={selection.has(row.id)}
                    onChange={(_event, selected) => selection.set([row], selected)}
                />
            </Td>
            <Td {...label('list.enabled')}>
                <Switch
                    id={`enable-${row.id}`}
                    aria-label={t('list.enable', { name: row.name })}
                    isChecked={pending.get(row.id) ?? row.enable}
                    onChange={(_event, checked) => onSwitch(row, checked)}
                />
            </Td>
            <Td {...label('list.id')}>{row.id}</Td>
            <Td {...label('list.name')} modifier="breakWord" className="orva-card-title">
                {row.can_edit ? <a href={routeTo(`tasks/${row.id}`)}>{row.name}</a> : row.name}
            </Td>
            <Td {...label('list.kind')}>
                <KindLabel row={row} />
            </Td>
            <Td {...label('list.action')} modifier="breakWord">
                <span className="orva-clamp" title={row.action}>{row.action}</span>
            </Td>
            <Td {...label('list.next')}>
                <NextStart text={row.next_trigger_time} />
            </Td>
            <Td {...label('list.last')}>
                <LastResult run={latest.get(row.id)} />
            </Td>
            <Td isActionCell>
                <RowMenu row={row} onAction={onAction} />
            </Td>
        </Tr>
    );
}

export function TaskTable(props: TaskTableProps) {
    const { rows, view, onSort } = props;
    const { t } = useTexts();
    const active = COLUMNS.findIndex((column) => column.sort === view.sort);
    return (
        <Table
            aria-label={t('list.title')}
            variant="compact"
            gridBreakPoint="grid-lg"
            className="orva-cards"
        >
            <Thead>
                <Tr>
                    <Th screenReaderText={t('list.selectColumn')} />
                    {COLUMNS.map(({ sort, title, width }, columnIndex) => (
                        <Th
                            key={title}
                            width={width}
                            modifier="nowrap"
                            sort={
                                sort === null
                                    ? undefined
                                    : {
                                          columnIndex,
                                          sortBy: { index: active, direction: view.direction },
                                          onSort: () => onSort(sort),
                                      }
                            }
                        >
                            {t(title)}
                        </Th>
                    ))}
                    <Th screenReaderText={t('list.actionsColumn')} />
                </Tr>
            </Thead>
            <Tbody>
                {rows.map((row) => (
                    <RowCells key={row.id} {...props} row={row} />
                ))}
            </Tbody>
        </Table>
    );
}
