/** "HH:MM" of 24 hours. */
export function clockText(hour: number, minute: number): string {
    return `${String(hour).padStart(2, '0')}:${String(minute).padStart(2, '0')}`;
}

/** Minutes after midnight of "HH:MM"; null for anything else. */
export function minutesOf(time: string): number | null {
    const parts = /^(\d\d):(\d\d)$/.exec(time);
    const hour = Number(parts?.[1]);
    const minute = Number(parts?.[2]);
    return parts && hour < 24 && minute < 60 ? hour * 60 + minute : null;
}

const MORNING = /^午前|a\.?m\.?$/;
const AFTERNOON = /^午後|p\.?m\.?$/;

/**
 * "HH:MM" of a time as people type it: "6:30", "18.30", "1830", "6", "6:30 pm", "18:30 Uhr", "午後6時30分",
 * full-width digits. Without a word for the half of the day it is of 24 hours. Null for anything else.
 */
export function parseClock(typed: string): string | null {
    // The form KC makes full-width digits and unusual blanks plain.
    const text = typed.normalize('NFKC').trim().toLowerCase();
    const late = AFTERNOON.test(text);
    const half = late || MORNING.test(text);
    const digits = text
        .replace(late ? AFTERNOON : MORNING, '')
        .replace(/(uhr|分)$/, '')
        .trim();
    const parts =
        /^(\d{1,2})(?:\s*[:.時]\s*(\d\d))?時?$/.exec(digits) ?? /^(\d{1,2})(\d\d)$/.exec(digits);
    if (!parts) {
        return null;
    }
    const hour = Number(parts[1]);
    const minute = Number(parts[2] ?? 0);
    if (minute > 59 || hour > (half ? 12 : 23)) {
        return null;
    }
    return clockText(half ? (hour % 12) + (late ? 12 : 0) : hour, minute);
}
