import {
    SearchInput,
    Toolbar,
    ToolbarContent,
    ToolbarGroup,
    ToolbarItem,
} from '@patternfly/react-core';

import type { TaskRow } from '../api/tasks';
import { useTexts } from '../texts/TextsProvider';
import { Choice } from '../ui/Choice';
import { Pages } from '../ui/Pages';
import type { Action } from './actions';
import { BulkMenu } from './BulkMenu';
import { SelectMenu } from './SelectMenu';
import { COLUMNS } from './TaskTable';
import type { Selection } from './useSelection';
import { KINDS, PER_PAGE, type TaskView } from './view';

interface Props {
    view: TaskView;
    rows: TaskRow[];
    total: number;
    selection: Selection;
    onView(change: Partial<TaskView>): void;
    onSelectAll(): void;
    onAction(action: Action): void;
}

/** On a phone the table has no head to sort by; this stands in for it. */
function SortChoice({ view, onView }: Pick<Props, 'view' | 'onView'>) {
    const { t } = useTexts();
    const options = COLUMNS.flatMap(({ sort, title }) =>
        sort === null
            ? []
            : (['asc', 'desc'] as const).map((direction) => ({
                  value: `${sort} ${direction}`,
                  label: t(`sort.${direction}`, { column: t(title) }),
              })),
    );
    return (
        <Choice
            label={t('sort.label')}
            value={`${view.sort} ${view.direction}`}
            options={options}
            onChange={(value) => {
                const [sort, direction] = value.split(' ');
                onView({
                    sort: sort as TaskView['sort'],
                    direction: direction as TaskView['direction'],
                    page: 1,
                });
            }}
        />
    );
}

export function TaskToolbar(props: Props) {
    const { view, rows, total, selection, onView, onSelectAll, onAction } = props;
    const { t } = useTexts();
    return (
        <Toolbar isStatic className="orva-toolbar">
            <ToolbarContent>
                <ToolbarGroup>
                    <ToolbarItem>
                        <SelectMenu
                            rows={rows}
                            total={total}
                            selection={selection}
                            onSelectAll={onSelectAll}
                        />
                    </ToolbarItem>
                    <ToolbarItem>
                        <BulkMenu count={selection.rows.length} onAction={onAction} />
                    </ToolbarItem>
                </ToolbarGroup>
                <ToolbarGroup variant="filter-group">
                    <ToolbarItem>
                        <SearchInput
                            aria-label={t('list.search')}
                            placeholder={t('list.searchHint')}
                            value={view.text}
                            onChange={(_event, text) => onView({ text, page: 1 })}
                            onClear={() => onView({ text: '', page: 1 })}
                            resetButtonLabel={t('list.clearFilter')}
                        />
                    </ToolbarItem>
                    <ToolbarItem>
                        <Choice
                            label={t('list.kind')}
                            value={view.kind}
                            options={[
                                { value: '' as const, label: t('list.allKinds') },
                                ...KINDS.map((kind) => ({ value: kind, label: t(`kind.${kind}`) })),
                            ]}
                            onChange={(kind) => onView({ kind, page: 1 })}
                        />
                    </ToolbarItem>
                    <ToolbarItem className="orva-only-narrow">
                        <SortChoice view={view} onView={onView} />
                    </ToolbarItem>
                </ToolbarGroup>
                <ToolbarItem align={{ default: 'alignEnd' }} className="orva-only-wide">
                    <Pages
                        variant="top"
                        total={total}
                        page={view.page}
                        perPage={view.perPage}
                        choices={PER_PAGE}
                        onPage={(page) => onView({ page })}
                        onPerPage={(perPage) => onView({ perPage, page: 1 })}
                    />
                </ToolbarItem>
            </ToolbarContent>
        </Toolbar>
    );
}
