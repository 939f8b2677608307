#include "host/commands/restart_output.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <string_view>

#include "host/commands/trace_texts.h"
#include "secrets/masked.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

void addEnd(const std::string& path, Tail& tail) {
    const sys::FileDescriptor file(
        ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOFOLLOW | O_CLOEXEC));
    struct stat found {};
    if (!file || ::fstat(file.get(), &found) != 0 || !S_ISREG(found.st_mode)) return;
    // More than is kept: a secret that begins before the end of the file that is kept is one, too.
    constexpr off_t kEnd = 2 * Tail::kBytes;
    char bytes[kEnd];
    const off_t from = std::max<off_t>(0, found.st_size - kEnd);
    const ssize_t got = ::pread(file.get(), bytes, sizeof bytes, from);
    if (got > 0) tail.append(secrets::masked({bytes, static_cast<std::size_t>(got)}));
}

}  // namespace

void addRestartOutput(Command& command) {
    const std::string_view line = command.line;
    if (line.substr(0, trace::kRestartShell.size()) != trace::kRestartShell) return;
    const std::size_t script = line.find(trace::kRestartScript);
    if (script == std::string_view::npos) return;
    const std::size_t begin = trace::kRestartShell.size();
    const std::string depot(line.substr(begin, script + 1 - begin));
    command.out.clear();
    command.err.clear();
    addEnd(depot + trace::kRestartOutput, command.out);
    addEnd(depot + trace::kRestartErrors, command.err);
}

}  // namespace host
