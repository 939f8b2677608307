/// Texts in which secret values are replaced by "***", by the rules of zavctl (secrets/value_reader.h):
/// what follows a name such as "password" and "=", ":", "=>" or ":=", to the next blank outside quotation
/// marks that has no backslash, or to the end of the line. Hosts have masked their texts by the same rules.

const named = `(?:password|passwd|pwd|secret|token|key)(?:\\\\{0,15}["'])?[ \\t]*[=:][=:> \\t]*`;
const within = (mark: string): string => `\\\\+${mark}[^${mark}\\r\\n]*${mark}?`;
const quoted = (mark: string): string => `${mark}(?:\\\\[^\\r\\n]|[^\\\\${mark}\\r\\n])*${mark}?`;
const marks = ['"', "'"].flatMap((mark) => [within(mark), quoted(mark)]).join('|');
const value = `(?:${marks}|\\\\[^\\r\\n]|[^ \\t\\r\\n"'])+`;
const secrets = new RegExp(`(${named})${value}`, 'gi');

/// The whole text as it may be shown.
export function masked(text: string): string {
    return text.replace(secrets, '$1***');
}
