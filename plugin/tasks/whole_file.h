/// Whole text files in one call, and the parts of a path. Texts are in the local code page on disk
/// and converted on the way; the directory separator is always "/". Nothing here throws: failures
/// are traced and reported by the result. All functions may be called from any thread.
#pragma once

#include "base/zavstr.h"

/// The whole file's text. Empty when the file cannot be read, which the caller cannot tell from an
/// empty file. NUL bytes are left out of the text.
ZAV::String readFile(ZAV::String path);

/// Replaces the file's content by the text, making the file when there is none. The file is
/// rewritten in place: a failure part-way leaves it cut. The text ends at its first 0, if there is
/// one. Returns 1, or 0 on failure.
int writeFile(const ZAV::String& path, const ZAV::String& text);

/// Removes the file. Returns 1, or 0 on failure.
int deleteFile(ZAV::String path);

/// Puts the part before the path's last "/" into `dir` and returns 1. Without a "/" behind the
/// first character there is no such part: `dir` stays as it is and the result is 0.
int getDirectoryFromPath(const ZAV::String& path, ZAV::String& dir);

/// The part after the path's last "/"; the whole path when it has no "/" behind its first
/// character.
ZAV::String getFilenameFromPath(const ZAV::String& path);

/// Removes every occurrence of `c`, whatever is left.
void removeChar(ZAV::String& s, char c);
