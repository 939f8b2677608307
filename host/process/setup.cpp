#include "host/process/setup.h"

#include <fcntl.h>
#include <malloc.h>
#include <sys/stat.h>
#include <unistd.h>

#include <clocale>
#include <csignal>
#include <cstdlib>
#include <initializer_list>

namespace host {
namespace {

extern "C" void onBrokenPipe(int) {}

/// Otherwise a socket could get the number 1 and receive what is meant for standard output.
void openStandardDescriptors() {
    while (true) {
        const int descriptor = ::open("/dev/null", O_RDWR);
        if (descriptor < 0 || descriptor > STDERR_FILENO) {
            if (descriptor >= 0) ::close(descriptor);
            return;
        }
    }
}

/// Installs a handler rather than SIG_IGN: exec resets handlers to the default, but children
/// inherit ignored signals. The programs that the plug-in runs expect to die of a broken pipe.
void surviveBrokenPipes() {
    struct sigaction action {};
    action.sa_handler = onBrokenPipe;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    ::sigaction(SIGPIPE, &action, nullptr);
}

/// Returns the memory of a burst of large outputs to the system once it is over. By default the
/// first large block that is freed raises both thresholds, and the heap then keeps its gaps.
void giveMemoryBack() {
    constexpr int kLargeBlock = 256 * 1024;
    ::mallopt(M_MMAP_THRESHOLD, kLargeBlock);
    ::mallopt(M_TRIM_THRESHOLD, kLargeBlock);
    // One arena per thread would take more memory than everything else in the host.
    ::mallopt(M_ARENA_MAX, 2);
}

/// Services are often started without a locale, and then no text outside ASCII could be converted.
/// In that case, and only then, text is UTF-8.
void chooseLocale() {
    for (const char* name : {"LC_ALL", "LC_CTYPE", "LANG"}) {
        const char* value = std::getenv(name);
        if (value != nullptr && *value != '\0') {
            std::setlocale(LC_CTYPE, "");
            return;
        }
    }
    if (std::setlocale(LC_CTYPE, "C.UTF-8") == nullptr) std::setlocale(LC_CTYPE, "");
}

}  // namespace

void setUpProcess() {
    openStandardDescriptors();
    surviveBrokenPipes();
    chooseLocale();
    giveMemoryBack();
}

void takeWritePermissionFromOthers() {
    // More would lock the users of run-as agents out of the programs that are installed.
    constexpr mode_t kGroupAndOthersWrite = 022;
    ::umask(::umask(kGroupAndOthersWrite) | kGroupAndOthersWrite);
}

}  // namespace host
