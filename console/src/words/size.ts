/// Numbers of bytes as people read them: "3 B", "1.5 KiB", "12 MiB".
export function bytesText(bytes: number): string {
    const names = ['B', 'KiB', 'MiB', 'GiB', 'TiB'];
    let value = bytes;
    let unit = 0;
    while (value >= 1024 && unit < names.length - 1) {
        value /= 1024;
        ++unit;
    }
    return `${unit === 0 || value >= 10 ? Math.round(value) : value.toFixed(1)} ${names[unit]}`;
}

/// "1 task", "12 tasks".
export function counted(count: number, one: string, many: string = `${one}s`): string {
    return `${count} ${count === 1 ? one : many}`;
}
