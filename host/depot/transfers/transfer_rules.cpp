#include "host/depot/transfers/transfer_rules.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <initializer_list>
#include <utility>

#include "host/depot/real_path.h"
#include "host/depot/transfers/conversion_probe.h"
#include "host/tables/narrow_text.h"

namespace host {
namespace {

/// Of the path of a file that the plug-in receives, in characters.
constexpr std::size_t kLongestPath = 1024;

bool isLink(const std::string& path) {
    struct stat found {};
    return ::lstat(path.c_str(), &found) == 0 && S_ISLNK(found.st_mode);
}

/// The directory part with its slash, and the rest.
std::pair<std::string, std::string> split(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    const std::size_t end = slash == std::string::npos ? 0 : slash + 1;
    return {path.substr(0, end), path.substr(end)};
}

/// Whether a ".." climbs above the depot, or follows a link, after which it could lead anywhere.
bool climbsOut(const std::string& depot, const std::string& path) {
    std::string prefix = depot;
    int depth = 0;
    for (std::size_t at = 0; at < path.size();) {
        const std::size_t end = std::min(path.find('/', at), path.size());
        const std::string component = path.substr(at, end - at);
        if (component == ".." && (--depth < 0 || isLink(prefix))) return true;
        if (component != ".." && component != "." && !component.empty()) ++depth;
        if (!component.empty()) prefix += "/" + component;
        at = end + 1;
    }
    return false;
}

/// The file system of a path, or of what exists above it; 0 when that cannot be told.
dev_t deviceOf(std::string path) {
    struct stat found {};
    while (!path.empty()) {
        if (::stat(path.c_str(), &found) == 0) return found.st_dev;
        path = split(path).first;
        while (!path.empty() && path.back() == '/')
            path.pop_back();
    }
    return 0;
}

/// Those of the paths, without links, that lie in the depot or hold it.
std::vector<std::string> reachable(const std::vector<std::string>& paths,
                                   const std::string& depot) {
    std::vector<std::string> found;
    const std::string top = realPath(depot);
    for (const std::string& path : paths) {
        const std::string real = realPath(path);
        if (isWithin(real, top) || isWithin(top, real)) found.push_back(real);
    }
    return found;
}

const char* const kConversionHint =
    "Use a depot on the file system of the home's tmp directory, or another name: without "
    "install.sh, DeployLnk.sh and .mdl in it nothing is converted.";

}  // namespace

TransferRules::TransferRules(const Depot& depot, const std::string& home, CodePage codePage,
                             bool guarded)
    : depot_(depot),
      kept_(reachable(depot.keptOut(), depot.directory())),
      temporaries_(home + "/tmp"),
      codePage_(std::move(codePage)),
      guarded_(guarded),
      conversionProblem_(guarded ? host::conversionProblem(temporaries_, depot.directory()) : "") {}

std::optional<std::string> TransferRules::arrivalName(const std::string& name) const {
    // Backslashes are replaced as characters: in some code pages a letter's second byte looks like
    // one.
    std::string text = codePage_.toUtf8(name);
    if (codePage_.fromUtf8(text) != name) return std::nullopt;
    std::replace(text.begin(), text.end(), '\\', '/');
    if (!text.empty() && text.front() == '/') text.erase(0, 1);
    return codePage_.fromUtf8(text);
}

std::string TransferRules::pathOf(const std::string& name) const {
    // A name that is no text gets other letters in its place, which lead nowhere else.
    return depot_.directory() + "/" + textOf(name);
}

ArrivalDirectory TransferRules::directoryOf(const std::string& name) const {
    return ArrivalDirectory(depot_.directory(), split(textOf(name)).first);
}

bool TransferRules::isIn(const std::string& name, const ArrivalDirectory& directory) const {
    return split(textOf(name)).first == directory.name();
}

std::string TransferRules::fileOf(const std::string& name) const {
    return split(textOf(name)).second;
}

bool TransferRules::mayBeOne(const std::string& name, const std::string& other) const {
    return fileOf(name) == fileOf(other);
}

std::string TransferRules::destination(const std::string& name) const {
    const auto [directory, base] = split(pathOf(name));
    return realPath(directory) + "/" + base;
}

bool TransferRules::isConverted(const std::string& name) const {
    // The plug-in looks at the whole path.
    const std::string path = pathOf(name);
    const auto marks = {"install.sh", "DeployLnk.sh", ".mdl"};
    return std::any_of(marks.begin(), marks.end(),
                       [&path](const char* mark) { return path.find(mark) != std::string::npos; });
}

bool TransferRules::leadsOut(const std::string& name, const ArrivalDirectory& directory) const {
    return directory.leadsOut() || climbsOut(depot_.directory(), textOf(name));
}

std::string TransferRules::whyImpossible(const std::string& name,
                                         const ArrivalDirectory& directory) const {
    if (leadsOut(name, directory)) return "the name leads out of the depot";
    const std::size_t length = utf16Units(codePage_.toUtf8(pathOf(name)));
    if (length > kLongestPath) {
        return "the name is too long: with the depot's path it has " + std::to_string(length) +
               " characters, and " + std::to_string(kLongestPath) + " are the most";
    }
    return directory.obstacleTo(fileOf(name));
}

/// A batch that is appended follows a link in the place of the file.
bool TransferRules::isKept(const std::string& name, const std::string& destination,
                           bool startsFile) const {
    const std::string behind = startsFile ? destination : realPath(pathOf(name));
    return std::any_of(kept_.begin(), kept_.end(), [&](const std::string& directory) {
        return isWithin(destination, directory) || isWithin(behind, directory);
    });
}

bool TransferRules::canConvertAt(const std::string& name) const {
    return deviceOf(pathOf(name)) == deviceOf(temporaries_);
}

Objection TransferRules::objectionToCut(const std::string& name) const {
    const std::size_t cut = bytesCut(pathOf(name), codePage_);
    return {"depot-names",
            "the file would arrive under another name: for letters outside ASCII in its path the "
            "plug-in cuts " +
                std::to_string(cut) + (cut == 1 ? " byte" : " bytes") + " off the end",
            bytesCut(textOf(name), codePage_) > 0
                ? "Rename the file: a name of ASCII letters is safe, also those of its folders."
                : "Rename the file or use a depot whose path is ASCII: such paths are safe."};
}

std::optional<Objection> TransferRules::objectionTo(const std::string& name,
                                                    const std::string& destination,
                                                    bool startsFile) const {
    if (isKept(name, destination, startsFile))
        return Objection{"", "the name lies in the host's own files", ""};
    if (!guarded_) return std::nullopt;
    if (!arrivalName(name)) {
        return Objection{"depot-names",
                         "the name is no text in the host's code page, " + codePage_.name() +
                             ", and would arrive as another one",
                         "Rename the file."};
    }
    if (bytesCut(pathOf(name), codePage_) > 0) return objectionToCut(name);
    if (!isConverted(name)) return std::nullopt;
    if (!conversionProblem_.empty()) {
        return Objection{"depot-conversion",
                         "line ends of this file would be converted, and it would be lost: " +
                             conversionProblem_,
                         kConversionHint};
    }
    if (!canConvertAt(name)) {
        return Objection{"depot-conversion",
                         "line ends of this file would be converted, and it would be lost: its "
                         "directory is on another file system than " +
                             temporaries_,
                         kConversionHint};
    }
    return std::nullopt;
}

}  // namespace host
