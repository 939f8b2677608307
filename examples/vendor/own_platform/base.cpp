// The environment and sleeping, over the C library.

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>

#include "platform/bss1.h"

const char* BSS1_GetEnv(const char* name, const char* fallback) {
    const char* const value = std::getenv(name);
    return value != nullptr ? value : fallback;
}

int BSS1_PutEnv(const char* setting) {
    const char* const equals = setting != nullptr ? std::strchr(setting, '=') : nullptr;
    if (equals == nullptr || equals == setting) return EINVAL;
    return ::setenv(std::string(setting, equals).c_str(), equals + 1, 1) == 0 ? 0 : errno;
}

void BSS1_Sleep(unsigned seconds) {
    timespec left{};
    left.tv_sec = static_cast<time_t>(seconds & 0x7FFFFFFFU);
    while (::nanosleep(&left, &left) == -1 && errno == EINTR) {
    }
}
