/// Files and directories that only their owner may use.
#pragma once

#include <string>
#include <string_view>

#include "fleet/server/keys/files/secret_text.h"

namespace fleet {

/// The next content of a file, complete on the disk under another name. Ended without commit() it
/// is removed, and a process that is killed leaves the file as it was.
class Replacement {
public:
    /// Writes the content with mode 0600 and syncs it. Throws KeysError.
    Replacement(std::string file, std::string_view content);
    ~Replacement();
    Replacement(const Replacement&) = delete;
    Replacement& operator=(const Replacement&) = delete;

    /// Puts it in the place of the file, durably. Throws KeysError.
    void commit();

private:
    const std::string file_;
    const std::string written_;
    bool isCommitted_ = false;
};

/// The file with that content and mode 0600; an older one is replaced at once. Throws KeysError.
void writePrivateFile(const std::string& file, std::string_view content);
/// A new one; KeysError if there is anything of that name.
void writeNewPrivateFile(const std::string& file, std::string_view content);
/// Puts a file that is complete in the place of another one, durably. Throws KeysError.
void putInPlace(const std::string& complete, const std::string& file);
/// Its content. Throws KeysError if it cannot be read, if others than the process's user may read
/// it, or if it has more than 4 MiB.
SecretText readPrivateFile(const std::string& file);

/// Makes the directory with mode 0700; one that is there must be that private already. Throws
/// KeysError.
void makePrivateDirectory(const std::string& path);
/// Throws KeysError if there is no such directory, or if others may use it.
void requirePrivateDirectory(const std::string& path);

}  // namespace fleet
