#include "fleet/operator/console/outputs/output_request.h"

#include <algorithm>
#include <cstddef>

#include "ctl/client/failure.h"
#include "http/url.h"

namespace fleet {
namespace {

/// They go into a question that the operator signs.
constexpr std::size_t kLongestName = 256;
constexpr std::size_t kLongestPosition = 64;

bool isName(const std::string& text) {
    return text.size() <= kLongestName &&
           std::none_of(text.begin(), text.end(),
                        [](unsigned char c) { return c < ' ' || c == '\x7f'; });
}

[[noreturn]] void refuse(const char* what) {
    throw ctl::Failure(ctl::kWrongUsage, what);
}

}  // namespace

OutputRequest readOutputRequest(const http::Request& request) {
    const auto target = http::parseTarget(request.target);
    if (!target) refuse("the target makes no sense");
    OutputRequest read;
    for (const auto& [name, value] : target->parameters) {
        std::string* const place = name == "host"   ? &read.host
                                   : name == "task" ? &read.task
                                                    : nullptr;
        if (place == nullptr || !place->empty()) refuse("host and task are the parameters");
        if (!isName(value)) refuse("a host or a task is called by one short line of text");
        *place = value;
    }
    if (read.host.empty() || read.task.empty()) refuse("host and task say what is wanted");
    if (!isOutputPosition(request.lastEventId)) refuse("Last-Event-ID is no position in an output");
    read.after = request.lastEventId;
    return read;
}

/// Which of them make sense the host knows itself.
bool isOutputPosition(const std::string& text) {
    constexpr const char* kLetters =
        "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_.:";
    return text.size() <= kLongestPosition && text.find_first_not_of(kLetters) == std::string::npos;
}

}  // namespace fleet
