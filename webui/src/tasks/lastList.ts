let address = '#/tasks';

/** Remembers how the list was shown last, for the way back to it. */
export function rememberList(fragment: string): void {
    address = fragment;
}

export function lastList(): string {
    return address;
}
