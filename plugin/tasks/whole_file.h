/// Reads and writes whole text files, and splits paths. Files are in the local code page; the texts
/// are converted. The directory separator is always "/". Nothing here throws: failures are traced
/// and reported by return values. Any thread may call these functions.
#pragma once

#include "base/zavstr.h"

/// Returns the text of the whole file, without its NUL bytes. Returns an empty text when the file
/// cannot be read; the caller cannot tell that from an empty file.
ZAV::String readFile(ZAV::String path);

/// Replaces the file's content by the text, up to its first 0. Creates the file if necessary.
/// Rewrites it in place: a failure half way leaves it truncated. Returns 1, or 0 on failure.
int writeFile(const ZAV::String& path, const ZAV::String& text);

/// Removes the file. Returns 1, or 0 on failure.
int deleteFile(ZAV::String path);

/// Stores the part before the path's last "/" in `dir` and returns 1. When there is no "/" after
/// the first character, leaves `dir` unchanged and returns 0.
int getDirectoryFromPath(const ZAV::String& path, ZAV::String& dir);

/// The part after the path's last "/"; the whole path when there is no "/" after its first
/// character.
ZAV::String getFilenameFromPath(const ZAV::String& path);

/// Removes every occurrence of `c`, even if that empties the text.
void removeChar(ZAV::String& s, char c);
