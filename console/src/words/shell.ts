/// Words as they are typed into a shell.

const plain = /^[A-Za-z0-9%+,\-./:=@_]+$/;

/// A word as a shell takes it for one: as it is, or in single quotes.
export function shellQuoted(word: string): string {
    return plain.test(word) ? word : `'${word.replaceAll("'", `'\\''`)}'`;
}

export function shellLine(words: readonly string[]): string {
    return words.map(shellQuoted).join(' ');
}

/// A line that gives a text to a command's standard input. The text ends with a line feed there.
export function withInput(line: string, text: string): string {
    const lines = text.replace(/\n$/, '').split('\n');
    let mark = 'END';
    while (lines.includes(mark)) mark += '_';
    return `${line} <<'${mark}'\n${lines.join('\n')}\n${mark}`;
}
