#include "host/home/temporary_directory.h"

#include <sys/stat.h>

#include <cerrno>
#include <system_error>

#include "host/process/start_error.h"

namespace host {

std::string temporaryDirectoryOf(const std::string& home) {
    return home + "/tmp";
}

void provideTemporaryDirectory(const std::string& home) {
    const std::string path = temporaryDirectoryOf(home);
    if (::mkdir(path.c_str(), 0700) == 0 || errno == EEXIST) return;
    throw StartError("cannot make " + path + ": " + std::generic_category().message(errno));
}

}  // namespace host
