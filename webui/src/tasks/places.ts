/** The button that opens the menu of the selected tasks. */
export const BULK_ID = 'selected-tasks';

/** The button that opens the menu of one task. */
export function actionsId(task: number): string {
    return `actions-${task}`;
}
