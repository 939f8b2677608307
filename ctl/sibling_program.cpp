#include "ctl/sibling_program.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <filesystem>
#include <string>
#include <system_error>

#include "ctl/client/failure.h"

namespace ctl {

namespace fs = std::filesystem;

namespace {

/// Where the program may be. Throws Failure if nobody can tell where this one is.
std::array<fs::path, 2> placesOf(const SiblingProgram& program) {
    std::error_code error;
    const fs::path here = fs::read_symlink("/proc/self/exe", error).parent_path();
    // Without it, names would be looked for in the working directory.
    if (error) throw Failure(kWrongUsage, "cannot tell where zavctl is: " + error.message());
    return {here / program.name, here.parent_path() / "libexec" / "zavmgmt" / program.name};
}

}  // namespace

bool isThere(const SiblingProgram& program) {
    const auto places = placesOf(program);
    return std::any_of(places.begin(), places.end(),
                       [](const fs::path& place) { return ::access(place.c_str(), X_OK) == 0; });
}

void becomeProgram(const SiblingProgram& program, char* const* argv) {
    int reason = ENOENT;
    for (const fs::path& place : placesOf(program)) {
        ::execv(place.c_str(), argv);
        if (errno != ENOENT) reason = errno;
    }
    const std::string name = program.name;
    if (reason == ENOENT) {
        throw Failure(kWrongUsage, program.missing,
                      "The program " + name + " is missing beside zavctl.");
    }
    throw Failure(kWrongUsage, name + " cannot be run: " + std::generic_category().message(reason));
}

}  // namespace ctl
