#include "ctl/show/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "ctl/show/fold.h"

namespace ctl {
namespace {

/// Narrower windows are not worth the effort.
constexpr std::size_t kLeastColumns = 40;

Output outputs[2];

bool wantsColours() {
    const char* const none = std::getenv("NO_COLOR");
    if (none != nullptr && *none != '\0') return false;
    const char* const terminal = std::getenv("TERM");
    return terminal == nullptr || std::strcmp(terminal, "dumb") != 0;
}

std::size_t columnsOf(int descriptor) {
    winsize size{};
    const bool isKnown = ::ioctl(descriptor, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
    if (!isKnown) return kColumns;
    return size.ws_col < kLeastColumns ? kLeastColumns : size.ws_col;
}

Output lookAt(int descriptor, bool isFolded) {
    if (::isatty(descriptor) != 1) return {};
    return {wantsColours(), isFolded ? columnsOf(descriptor) : 0};
}

const char* codeOf(Tone tone) {
    switch (tone) {
        case Tone::Good:
            return "\x1b[32m";
        case Tone::Bad:
            return "\x1b[31m";
        case Tone::Attention:
            break;
    }
    return "\x1b[33m";
}

}  // namespace

void lookAtTerminals(bool foldsOutput) {
    outputs[0] = lookAt(STDOUT_FILENO, foldsOutput);
    outputs[1] = lookAt(STDERR_FILENO, true);
}

const Output& standardOutput() {
    return outputs[0];
}

const Output& standardError() {
    return outputs[1];
}

std::string toned(const std::string& text, Tone tone, const Output& output) {
    return output.isColoured ? codeOf(tone) + text + "\x1b[0m" : text;
}

}  // namespace ctl
