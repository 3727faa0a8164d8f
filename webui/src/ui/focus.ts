function firstOf(ids: readonly string[]): HTMLElement | null | undefined {
    return [...ids, 'main']
        .map((id) => document.getElementById(id))
        .find((element) => element && !element.matches(':disabled'));
}

/** Once a dialog is gone, the focus goes to the first of these that is there, or else to the view. */
export function focusFirst(ids: readonly string[]): void {
    setTimeout(() => firstOf(ids)?.focus());
}

/** The same, only if the element that had the focus went away with it. */
export function keepFocus(ids: readonly string[]): void {
    setTimeout(() => {
        if (document.activeElement === document.body) {
            firstOf(ids)?.focus();
        }
    });
}
