#include "ctl/sibling_program.h"

#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>
#include <system_error>

#include "ctl/client/failure.h"

namespace ctl {

namespace fs = std::filesystem;

void becomeProgram(const SiblingProgram& program, char* const* argv) {
    std::error_code error;
    const fs::path here = fs::read_symlink("/proc/self/exe", error).parent_path();
    // Without it, names would be looked for in the working directory.
    if (error) throw Failure(kWrongUsage, "cannot tell where zavctl is: " + error.message());
    const fs::path places[] = {here / program.name,
                               here.parent_path() / "libexec" / "zavmgmt" / program.name};
    int reason = ENOENT;
    for (const fs::path& place : places) {
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
