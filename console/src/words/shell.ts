/// Words as they are typed into a shell.
import { holdsHidden } from './printable';

const plain = /^[A-Za-z0-9%+,\-./:=@_]+$/;

/// A character as `$'…'` has it. What nobody sees stands there as bytes, whatever the locale.
function dollarQuoted(character: string): string {
    if (character === '\n') return '\\n';
    if (character === '\t') return '\\t';
    if (character === '\\' || character === "'") return `\\${character}`;
    if (!holdsHidden(character)) return character;
    return Array.from(new TextEncoder().encode(character), (byte) => `\\x${byte.toString(16).padStart(2, '0')}`).join('');
}

/// A word as a shell takes it for one: as it is, or in single quotes. With characters that a terminal
/// would obey when the line is pasted it is spelled out, as bash and zsh read it.
export function shellQuoted(word: string): string {
    if (holdsHidden(word) || /[\t\n]/.test(word)) return `$'${Array.from(word, dollarQuoted).join('')}'`;
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
