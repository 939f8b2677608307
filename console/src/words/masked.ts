/// Texts in which secret values are replaced by "***", by the rules of zavctl (secrets/value_reader.h):
/// what follows a name such as "password" and "=" or ":", to the next blank outside quotation marks or
/// to the end of the line.

const named = `(?:password|passwd|pwd|secret|token|key)["']?[ \\t]*[=:][ \\t]*`;
const value = `(?:"[^"\\r\\n]*"?|'[^'\\r\\n]*'?|[^ \\t\\r\\n"'])+`;
const secrets = new RegExp(`(${named})${value}`, 'gi');

/// The whole text as it may be shown.
export function masked(text: string): string {
    return text.replace(secrets, '$1***');
}
