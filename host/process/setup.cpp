#include "host/process/setup.h"

#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

#include <clocale>
#include <csignal>
#include <cstdlib>
#include <initializer_list>

namespace host {
namespace {

extern "C" void onBrokenPipe(int) {}

/// A socket that took the number 1 would get what is meant for standard output.
void openStandardDescriptors() {
    while (true) {
        const int descriptor = ::open("/dev/null", O_RDWR);
        if (descriptor < 0 || descriptor > STDERR_FILENO) {
            if (descriptor >= 0) ::close(descriptor);
            return;
        }
    }
}

/// A handler instead of SIG_IGN, because exec puts a handler back to the default and passes on what
/// is ignored: the programs that the plug-in runs expect to die of a broken pipe.
void surviveBrokenPipes() {
    struct sigaction action {};
    action.sa_handler = onBrokenPipe;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    ::sigaction(SIGPIPE, &action, nullptr);
}

/// What a burst of large outputs took goes back to the system when it is over. By default the first
/// large block that is freed raises both limits, and then the gaps between small blocks stay.
void giveMemoryBack() {
    constexpr int kLargeBlock = 256 * 1024;
    ::mallopt(M_MMAP_THRESHOLD, kLargeBlock);
    ::mallopt(M_TRIM_THRESHOLD, kLargeBlock);
    // One arena per thread would cost more than all that the host holds.
    ::mallopt(M_ARENA_MAX, 2);
}

/// Services are often started without any locale, which would make everything beyond ASCII
/// unspeakable; only in that case text is taken as UTF-8.
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

}  // namespace host
