/// A directory of the depot that files are to arrive in.
#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>

#include "system/file_descriptor.h"

namespace host {

/// What was found there when the object was made. Whoever asks about many files keeps it for those
/// that follow in the same directory: most of what there is to look up is the directory's. Changes
/// nothing; one thread at a time.
class ArrivalDirectory {
public:
    /// `name` is relative to `depot` and ends in a slash, or is empty for the depot itself. Neither
    /// need exist.
    ArrivalDirectory(const std::string& depot, std::string name);

    const std::string& name() const { return name_; }
    /// Its path without links.
    const std::string& realPath() const { return real_; }
    /// Whether a link among the directories that exist leads out of the depot.
    bool leadsOut() const { return leadsOut_; }

    /// Why no file of that name can be made or replaced here; empty when nothing stands in the way,
    /// or the depot cannot be opened. The words are a sentence's.
    std::string obstacleTo(const std::string& file) const;
    /// What is there under that name now, a link as itself.
    std::optional<struct stat> find(const std::string& file) const;

private:
    void lookFrom(int depot);

    std::string name_;
    std::string real_;
    bool leadsOut_ = false;
    std::string obstacle_;        ///< to all of its files
    long longestPart_ = 0;        ///< of a name, in bytes; 0 or less when there is no limit
    sys::FileDescriptor opened_;  ///< not open when it is yet to be made
};

}  // namespace host
