import type { Language } from './language';

export interface Format {
    /** "2026-11-22 02:00" or "2026-11-22", the appliance's local time, in the reader's manner. */
    local(text: string): string;
    /** The same in two parts, for narrow places. */
    localParts(text: string): [day: string, time: string];
    localDate(text: string): string;
    /** A date with its day of the week, in full. */
    dateWithDay(text: string): string;
    /** An instant, shown on the appliance's clock. */
    instant(utc: string | null): string;
    /** A length of time in milliseconds. */
    length(milliseconds: number): string;
    bytes(count: number): string;
    number(count: number): string;
    list(words: string[]): string;
    /** 0 is Sunday. */
    weekDay(day: number, width: 'long' | 'short'): string;
    /** "HH:MM" in the reader's manner. */
    clock(hour: number, minute: number): string;
}

const UNITS = ['byte', 'kilobyte', 'megabyte', 'gigabyte', 'terabyte'] as const;
// A Sunday, on a calendar of its own without a zone.
const SUNDAY = Date.UTC(2023, 0, 1);
const DAY = 86_400_000;

function knownZone(zone: string | undefined): string | undefined {
    try {
        new Intl.DateTimeFormat('en', { timeZone: zone });
        return zone;
    } catch {
        return undefined;
    }
}

function floating(text: string): Date | null {
    const parts = /^(\d{4})-(\d\d)-(\d\d)(?:[ T](\d\d):(\d\d))?/.exec(text);
    if (!parts) {
        return null;
    }
    const [year, month, day, hour, minute] = parts.slice(1).map((part) => Number(part ?? 0));
    return new Date(Date.UTC(year ?? 0, (month ?? 1) - 1, day ?? 1, hour ?? 0, minute ?? 0));
}

export function makeFormat(language: Language, zone: string | undefined): Format {
    const timeZone = knownZone(zone);
    const day = new Intl.DateTimeFormat(language, {
        weekday: 'short',
        year: 'numeric',
        month: 'short',
        day: 'numeric',
        timeZone: 'UTC',
    });
    const date = new Intl.DateTimeFormat(language, { dateStyle: 'long', timeZone: 'UTC' });
    const full = new Intl.DateTimeFormat(language, { dateStyle: 'full', timeZone: 'UTC' });
    const instant = new Intl.DateTimeFormat(language, {
        dateStyle: 'medium',
        timeStyle: 'medium',
        timeZone,
    });
    const time = new Intl.DateTimeFormat(language, { timeStyle: 'short', timeZone: 'UTC' });
    const comma = language === 'ja' ? ' ' : ', ';
    const number = new Intl.NumberFormat(language);
    const list = new Intl.ListFormat(language, { type: 'conjunction' });
    const unit = (value: number, name: string, digits = 0) =>
        new Intl.NumberFormat(language, {
            style: 'unit',
            unit: name,
            // The short form of a byte knows no plural.
            unitDisplay: name === 'byte' ? 'long' : 'short',
            maximumFractionDigits: digits,
        }).format(value);

    const local = (formatter: Intl.DateTimeFormat) => (text: string) => {
        const moment = floating(text);
        return moment ? formatter.format(moment) : text;
    };

    return {
        local: (text) => (floating(text) ? local(day)(text) + comma + local(time)(text) : text),
        localParts: (text) => [local(day)(text), local(time)(text)],
        localDate: local(date),
        dateWithDay: local(full),
        instant: (utc) => (utc === null ? '' : instant.format(new Date(utc))),
        length(milliseconds) {
            const seconds = Math.max(0, milliseconds) / 1000;
            if (seconds < 1) {
                return unit(Math.round(seconds * 1000), 'millisecond');
            }
            if (seconds < 10) {
                return unit(seconds, 'second', 1);
            }
            const whole = Math.round(seconds);
            const parts: [number, string][] = [
                [Math.floor(whole / 3600), 'hour'],
                [Math.floor(whole / 60) % 60, 'minute'],
                [whole % 60, 'second'],
            ];
            return parts
                .filter(([value]) => value > 0)
                .slice(0, 2)
                .map(([value, name]) => unit(value, name))
                .join(' ');
        },
        bytes(count) {
            let value = count;
            let step = 0;
            while (value >= 1024 && step < UNITS.length - 1) {
                value /= 1024;
                step += 1;
            }
            return unit(value, UNITS[step] ?? 'byte', step === 0 || value >= 100 ? 0 : 1);
        },
        number: (count) => number.format(count),
        list: (words) => list.format(words),
        weekDay: (day, width) =>
            new Intl.DateTimeFormat(language, { weekday: width, timeZone: 'UTC' }).format(
                SUNDAY + day * DAY,
            ),
        clock: (hour, minute) => time.format(Date.UTC(2023, 0, 1, hour, minute)),
    };
}
