#include "host/guard/machine/listing.h"

#include <algorithm>
#include <filesystem>

namespace fs = std::filesystem;

namespace host {
namespace {

/// Depots are not so large; whoever makes them so must not hold a worker.
constexpr int kMostEntries = 4096;

/// Calls `visit` with each entry of the directory, as long as `left` allows.
template <typename Visit>
void forEachEntry(const fs::path& directory, int& left, Visit visit) {
    std::error_code error;
    fs::directory_iterator at(directory, error);
    while (!error && at != fs::directory_iterator() && left-- > 0) {
        visit(*at);
        at.increment(error);
    }
}

/// Whether the entry is of the wanted type itself, not through a link.
bool is(const fs::directory_entry& entry, fs::file_type type) {
    std::error_code error;
    return entry.symlink_status(error).type() == type;
}

void collectFolders(const fs::path& directory, const std::string& prefix, int levels, int& left,
                    std::vector<std::string>& found) {
    forEachEntry(directory, left, [&](const fs::directory_entry& entry) {
        if (!is(entry, fs::file_type::directory)) return;
        const std::string name = prefix + entry.path().filename().string();
        const std::size_t before = found.size();
        if (levels > 1) collectFolders(entry.path(), name + "/", levels - 1, left, found);
        if (found.size() == before) found.push_back(name);
    });
}

}  // namespace

std::vector<std::string> foldersIn(const std::string& directory, int levels) {
    std::vector<std::string> found;
    int left = kMostEntries;
    collectFolders(directory, "", levels, left, found);
    std::sort(found.begin(), found.end());
    return found;
}

std::vector<std::string> filesIn(const std::string& directory) {
    std::vector<std::string> found;
    int left = kMostEntries;
    forEachEntry(directory, left, [&found](const fs::directory_entry& entry) {
        if (is(entry, fs::file_type::regular)) found.push_back(entry.path().filename().string());
    });
    std::sort(found.begin(), found.end());
    return found;
}

}  // namespace host
