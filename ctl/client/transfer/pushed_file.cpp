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

std::vector<PushedFile> filesOfFolder(const std::string& folder, const std::string& destination) {
    // What the folder's path stands before; taken off as text, which is a tenth of the work of
    // comparing paths.
    const std::size_t prefix = folder == "/" ? 1 : folder.size() + 1;
    std::vector<PushedFile> files;
    for (const auto& entry : fs::recursive_directory_iterator(folder)) {
        if (!entry.is_regular_file()) continue;
        const std::string& source = entry.path().native();
        const std::string relative = source.substr(prefix);
        refuseBackslash(relative);
        files.push_back({source, destination + "/" + relative, entry.file_size(), 0, {}});
    }
    std::sort(files.begin(), files.end(),
              [](const PushedFile& a, const PushedFile& b) { return a.name < b.name; });
    return files;
}

std::vector<PushedFile> filesOf(const std::string& source, const std::string& destination) {
    const fs::path path = withoutTrailingSlashes(source);
    std::error_code error;
    const fs::file_status found = fs::status(path, error);
    if (!fs::exists(found)) throw Failure(kWrongUsage, "there is no " + source);
    const std::string base = fs::absolute(path).filename().string();
    const std::string name = nameInDepot(base, destination);
    if (fs::is_directory(found)) return filesOfFolder(path.native(), withoutTrailingSlashes(name));
    if (!fs::is_regular_file(found)) throw Failure(kWrongUsage, source + " is no regular file");
    refuseBackslash(base);
    return {{path.native(), name, fs::file_size(path), 0, {}}};
}

}  // namespace

std::vector<PushedFile> filesToPush(const std::string& source, const std::string& destination) {
    try {
        std::vector<PushedFile> files = filesOf(source, destination);
        if (files.empty()) throw Failure(kWrongUsage, source + " holds no files");
        return files;
    } catch (const fs::filesystem_error& error) {
        throw Failure(kWrongUsage,
                      "cannot read " + error.path1().string() + ": " + error.code().message());
    }
}

}  // namespace ctl
