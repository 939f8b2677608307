#include "ctl/client/transfer/pushed_file.h"

#include <algorithm>
#include <filesystem>

#include "ctl/client/failure.h"

namespace fs = std::filesystem;

namespace ctl {
namespace {

std::string withoutTrailingSlashes(std::string text) {
    while (text.size() > 1 && text.back() == '/')
        text.pop_back();
    return text;
}

/// "\" separates components on the wire, so a name that holds one would arrive as another.
void refuseBackslash(const std::string& name) {
    if (name.find('\\') != std::string::npos) {
        throw Failure(kWrongUsage, "a name with a backslash cannot be pushed: " + name);
    }
}

std::string nameInDepot(const std::string& base, const std::string& destination) {
    if (destination.empty()) return base;
    return destination.back() == '/' ? destination + base : destination;
}

/// What is said of an entry that is no file; nothing for a folder that holds something.
std::string whySkipped(const fs::directory_entry& entry) {
    if (entry.is_symlink()) {
        return entry.exists() ? "a link to a folder is not followed" : "the link leads nowhere";
    }
    switch (entry.status().type()) {
        case fs::file_type::directory:
            return fs::is_empty(entry.path()) ? "the folder is empty" : "";
        case fs::file_type::fifo:
            return "it is a FIFO";
        case fs::file_type::socket:
            return "it is a socket";
        default:
            return "it is no regular file";
    }
}

/// Where a link to a file leads when that is outside the folder; else nothing. `root` is the
/// folder's path without links.
fs::path outsideTarget(const fs::directory_entry& entry, const fs::path& root) {
    if (!entry.is_symlink()) return {};
    fs::path target = fs::canonical(entry.path());
    const auto [end, rest] = std::mismatch(root.begin(), root.end(), target.begin(), target.end());
    return end == root.end() ? fs::path() : target;
}

PushPlan filesOfFolder(const std::string& folder, const std::string& destination, Links links) {
    // What the folder's path stands before; taken off as text, which is a tenth of the work of
    // comparing paths.
    const std::size_t prefix = folder == "/" ? 1 : folder.size() + 1;
    const fs::path root = fs::canonical(folder);
    PushPlan plan;
    std::vector<PushedFile>& files = plan.files;
    for (const auto& entry : fs::recursive_directory_iterator(folder)) {
        const std::string& source = entry.path().native();
        const std::string relative = source.substr(prefix);
        std::error_code unreadable;
        if (!entry.is_regular_file(unreadable)) {
            const std::string why = whySkipped(entry);
            if (!why.empty()) plan.skipped.push_back(relative + " is not pushed: " + why);
            continue;
        }
        const fs::path outside = links == Links::All ? fs::path() : outsideTarget(entry, root);
        if (!outside.empty()) {
            plan.skipped.push_back(relative +
                                   " is not pushed: the link leads out of the folder, to " +
                                   outside.native() + "; --follow pushes that file");
            continue;
        }
        refuseBackslash(relative);
        files.push_back({source, destination + "/" + relative, entry.file_size(), 0, {}});
    }
    std::sort(files.begin(), files.end(),
              [](const PushedFile& a, const PushedFile& b) { return a.name < b.name; });
    std::sort(plan.skipped.begin(), plan.skipped.end());
    return plan;
}

PushPlan filesOf(const std::string& source, const std::string& destination, Links links) {
    const fs::path path = withoutTrailingSlashes(source);
    std::error_code error;
    const fs::file_status found = fs::status(path, error);
    if (!fs::exists(found)) throw Failure(kWrongUsage, "there is no " + source);
    const std::string base = fs::absolute(path).filename().string();
    const std::string name = nameInDepot(base, destination);
    if (fs::is_directory(found)) {
        return filesOfFolder(path.native(), withoutTrailingSlashes(name), links);
    }
    if (!fs::is_regular_file(found)) throw Failure(kWrongUsage, source + " is no regular file");
    refuseBackslash(base);
    return {{{path.native(), name, fs::file_size(path), 0, {}}}, {}};
}

}  // namespace

std::string pathInDepot(const std::string& name) {
    std::string path = name;
    std::replace(path.begin(), path.end(), '\\', '/');
    return path.substr(std::min(path.find_first_not_of('/'), path.size()));
}

bool leadsOutOfDepot(const std::string& name) {
    int depth = 0;
    for (const fs::path& part : fs::path(pathInDepot(name))) {
        if (part == "..")
            --depth;
        else if (!part.empty() && part != ".")
            ++depth;
        if (depth < 0) return true;
    }
    return false;
}

PushPlan filesToPush(const std::string& source, const std::string& destination, Links links) {
    try {
        PushPlan plan = filesOf(source, destination, links);
        if (plan.files.empty()) {
            const std::string why = plan.skipped.empty() ? std::string() : plan.skipped.front();
            throw Failure(kWrongUsage, source + " holds no files", why);
        }
        return plan;
    } catch (const fs::filesystem_error& error) {
        throw Failure(kWrongUsage,
                      "cannot read " + error.path1().string() + ": " + error.code().message());
    }
}

}  // namespace ctl
