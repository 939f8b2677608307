// What a host, a program of the home or a machine that died has left.

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include "host/checks/check.h"
#include "host/checks/wording.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

namespace fs = std::filesystem;

using Names = std::vector<std::string>;

template <typename Use>
void forEachEntry(const fs::path& folder, Use use) {
    std::error_code error;
    fs::directory_iterator entry(folder, error);
    for (; !error && entry != fs::directory_iterator(); entry.increment(error)) {
        use(entry->path());
    }
}

bool isThere(const std::string& path) {
    struct stat found {};
    return ::lstat(path.c_str(), &found) == 0;
}

// ---- Configurations -----------------------------------------------------------------------------

/// A change of the universal agent's start-up parameters whose last step failed.
Names copiesIn(CheckSubject& subject) {
    Names found;
    for (const char* const folder : {"config", "config/.ConfigData"}) {
        forEachEntry(subject.inHome(folder), [&found](const fs::path& path) {
            if (path.extension() == ".copy") found.push_back(path.string());
        });
    }
    return found;
}

/// The process whose number a program of the home writes into the name of what is to replace a
/// file, ".FILE.PROCESS.SIX"; "" for other names.
std::string writerOf(const std::string& name) {
    constexpr std::size_t kRandomLetters = 6;
    const std::size_t last = name.rfind('.');
    if (name.front() != '.' || last == 0 || name.size() - last - 1 != kRandomLetters) return "";
    const std::size_t before = name.rfind('.', last - 1);
    if (before == 0) return "";
    const std::string process = name.substr(before + 1, last - before - 1);
    const bool isNumber =
        !process.empty() && std::all_of(process.begin(), process.end(),
                                        [](unsigned char c) { return std::isdigit(c) != 0; });
    return isNumber ? process : "";
}

/// Files that were to replace others, of programs of the home that are gone.
Names replacementsIn(CheckSubject& subject) {
    Names found;
    for (const char* const folder : {"bin", "config", "config/.ConfigData", "registry", "run"}) {
        forEachEntry(subject.inHome(folder), [&found](const fs::path& path) {
            const std::string writer = writerOf(path.filename().string());
            if (!writer.empty() && !isThere("/proc/" + writer)) found.push_back(path.string());
        });
    }
    return found;
}

// ---- Products -----------------------------------------------------------------------------------

/// The shared component's folder has another name than its product.
std::string productOf(const std::string& folder) {
    return folder == "bin" ? "ax" : folder;
}

/// Whether a program of the home is installing, removing, starting or stopping the product.
bool isBusyWith(CheckSubject& subject, const std::string& product) {
    const std::string path = subject.inHome("run/." + product + ".lock");
    const sys::FileDescriptor lock(
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    return lock && ::flock(lock.get(), LOCK_SH | LOCK_NB) != 0;
}

/// The product whose installation or removal the folder is a part of, ".PRODUCT.new" for example;
/// "" for other names.
std::string productInHand(const std::string& name) {
    const std::size_t dot = name.rfind('.');
    if (name.front() != '.' || dot < 2) return "";
    const std::string end = name.substr(dot);
    const bool isPart = end == ".new" || end == ".old" || end == ".gone";
    return isPart ? productOf(name.substr(1, dot - 1)) : "";
}

/// Whether the folder is a part of a product, or a product that lacks its entry in the inventory.
bool isUnfinished(CheckSubject& subject, const fs::path& folder) {
    const std::string name = folder.filename().string();
    const std::string part = productInHand(name);
    if (!part.empty()) return !isBusyWith(subject, part);
    const std::string product = productOf(name);
    const std::string platform = folder.parent_path().filename().string();
    return isThere(folder.string() + "/.manifest") &&
           !isThere(subject.inHome("registry/" + product + platform + ".ver")) &&
           !isBusyWith(subject, product);
}

/// What is left of installations and removals that nobody carries on.
Names unfinishedProductsIn(CheckSubject& subject) {
    Names found;
    forEachEntry(subject.inHome("agtqvs6"), [&](const fs::path& platform) {
        forEachEntry(platform, [&](const fs::path& folder) {
            if (isUnfinished(subject, folder)) found.push_back(folder.string());
        });
    });
    return found;
}

// ---- The depot ----------------------------------------------------------------------------------

/// The script of an installation that may restart the host removes rc.txt first and writes it last.
Names scriptsIn(CheckSubject& subject) {
    const std::string depot = depotOf(subject);
    const std::string script = depot + "/runcmd.sh";
    if (!isThere(script) || isThere(depot + "/rc.txt")) return {};
    return {script};
}

/// The text of a pushed script on its way from the depot and back.
Names conversionsIn(CheckSubject& subject) {
    const std::string text = subject.inHome("tmp/.zavtemp");
    if (!isThere(text)) return {};
    return {text};
}

/// A kind of leftover, and what to do with it.
struct Kind {
    Names (*find)(CheckSubject& subject);
    const char* cause;
    const char* remedy;
};

constexpr std::array<Kind, 5> kKinds = {
    Kind{copiesIn, "an interrupted change of a configuration left ",
         "compare it with the file without .copy, keep the right one and remove the other"},
    Kind{replacementsIn, "a program that was killed left ",
         "the file that was to be replaced is whole; remove the leftover"},
    Kind{unfinishedProductsIn, "an interrupted installation or removal left ",
         "install the product again, which goes over what is left, or remove it with "
         "bin/uninstall.sh"},
    Kind{scriptsIn, "an installation that was interrupted, or goes on, left ",
         "if it does not go on, remove the script and install the product again"},
    Kind{conversionsIn, "an interrupted transfer left ",
         "push the file that was on its way again, and remove the leftover"},
};

void append(std::string& text, const std::string& more) {
    if (!text.empty()) text += "; ";
    text += more;
}

}  // namespace

CheckFunction checkLeftovers;

Finding checkLeftovers(CheckSubject& subject) {
    Finding finding;
    for (const Kind& kind : kKinds) {
        const Names found = kind.find(subject);
        if (found.empty()) continue;
        finding.verdict = Verdict::Warning;
        append(finding.text, kind.cause + listed(found));
        append(finding.remedy, kind.remedy);
    }
    if (finding.verdict == Verdict::Ok) finding.text = "nothing was interrupted";
    return finding;
}

}  // namespace host
