/** The kinds of task that the page can make. */
export const EDITABLE_KINDS = ['beep', 'script', 'recycle', 'service'] as const;
export type EditableKind = (typeof EDITABLE_KINDS)[number];

export function asEditableKind(type: string): EditableKind | null {
    return EDITABLE_KINDS.find((kind) => kind === type) ?? null;
}
