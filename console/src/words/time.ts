/// Times as people read them.

const minute = 60;
const hour = 60 * minute;
const day = 24 * hour;

/// A span in its largest unit: "3 s", "5 min", "2 h", "1 day".
export function spanText(seconds: number): string {
    const whole = Math.max(Math.floor(seconds), 0);
    if (whole < minute) return `${whole} s`;
    if (whole < hour) return `${Math.floor(whole / minute)} min`;
    if (whole < day) return `${Math.floor(whole / hour)} h`;
    const days = Math.floor(whole / day);
    return days === 1 ? '1 day' : `${days} days`;
}

/// How long something took: "0.4 s", "12 s", "3 min 5 s".
export function elapsedText(milliseconds: number): string {
    const seconds = Math.max(milliseconds, 0) / 1000;
    if (seconds < 10) return `${seconds.toFixed(1)} s`;
    if (seconds < minute) return `${Math.floor(seconds)} s`;
    if (seconds < hour) return `${Math.floor(seconds / minute)} min ${Math.floor(seconds % minute)} s`;
    return `${Math.floor(seconds / hour)} h ${Math.floor((seconds % hour) / minute)} min`;
}

function two(value: number): string {
    return String(value).padStart(2, '0');
}

function clock(time: Date): string {
    return `${two(time.getHours())}:${two(time.getMinutes())}:${two(time.getSeconds())}`;
}

function date(time: Date): string {
    return `${time.getFullYear()}-${two(time.getMonth() + 1)}-${two(time.getDate())}`;
}

/// Local time, with the date unless it is today.
export function localText(time: Date, now: Date): string {
    return date(time) === date(now) ? clock(time) : `${date(time)} ${clock(time)}`;
}

/// "3 min ago"; "in 3 min" for what is to come.
export function relativeText(time: Date, now: Date): string {
    const seconds = (now.getTime() - time.getTime()) / 1000;
    return seconds < -1 ? `in ${spanText(-seconds)}` : `${spanText(seconds)} ago`;
}

/// Everything: local date and time to the millisecond with its distance from UTC, and UTC itself.
export function exactText(time: Date): string {
    const offset = -time.getTimezoneOffset();
    const size = Math.abs(offset);
    const zone = `${offset < 0 ? '-' : '+'}${two(Math.floor(size / 60))}:${two(size % 60)}`;
    const fraction = String(time.getMilliseconds()).padStart(3, '0');
    return `${date(time)} ${clock(time)}.${fraction} ${zone} (${time.toISOString()})`;
}

/// A time of the interface; undefined if it is not one.
export function parsedTime(text: string | null | undefined): Date | undefined {
    if (!text) return undefined;
    const time = new Date(text);
    return Number.isNaN(time.getTime()) ? undefined : time;
}

const units: Readonly<Record<string, number>> = { s: 1, min: minute, m: minute, h: hour, d: day };

/// The time that a word such as "15min", "2h" or "7d" leads back to, or an RFC 3339 time; undefined if
/// it is neither.
export function timeSince(word: string, now: Date): Date | undefined {
    const span = /^(\d{1,6})\s*(s|min|m|h|d)$/.exec(word.trim());
    if (!span) return /^\d{4}-\d\d-\d\dT/.test(word) ? parsedTime(word) : undefined;
    return new Date(now.getTime() - Number(span[1]) * (units[span[2] ?? ''] ?? 0) * 1000);
}
