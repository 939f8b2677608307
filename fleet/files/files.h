/// Small files on which the fleet's programs depend.
#pragma once

#include <sys/types.h>

#include <string>

namespace fleet {

/// Who may read a file.
enum class Secrecy {
    Public,  ///< anybody
    Secret   ///< its owner only; a file that others may read is refused
};

/// The content of a plain file of at most 1 MiB, which belongs to this process's user or to root
/// and which nobody else may write. Throws FileError.
std::string readFile(const std::string& path, Secrecy secrecy);

/// Whether there is anything of that name. Throws FileError when that cannot be told.
bool isThere(const std::string& path);

/// Puts a file in the place of what was there, at once and whole: after a power cut there is the
/// old one or the new one. Durable when it returns. A secret one gets mode 0600, others 0644.
/// Throws FileError; then the old one is as it was.
void replaceFile(const std::string& path, const std::string& content, Secrecy secrecy);

}  // namespace fleet
