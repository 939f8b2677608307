#include "ctl/verbs/watched.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <utility>

#include "ctl/client/interruption.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"

namespace ctl {
namespace {

// NOLINTNEXTLINE(bugprone-exception-escape): JSON does not throw when it is moved
class View {
public:
    void show(Look look) {
        if (isTerminal_) {
            print({"\x1b[H\x1b[2J" + look.page.out, look.page.err});
        } else if (!hasShown_ || look.seen != shown_) {
            print({(hasShown_ ? "\n" : "") + look.page.out, look.page.err});
        }
        shown_ = std::move(look.seen);
        hasShown_ = true;
        isAway_ = false;
    }
    void showAway(const Failure& failure) {
        if (!isAway_) print({{}, complaint(std::string("note: ") + failure.what())});
        isAway_ = true;
    }
    bool hasShown() const { return hasShown_; }

private:
    const bool isTerminal_ = ::isatty(STDOUT_FILENO) == 1;
    bool isAway_ = false;
    bool hasShown_ = false;
    nlohmann::json shown_;
};

}  // namespace

ExitStatus watch(const Invocation& invocation, const std::function<Look()>& look) {
    if (invocation.format == Format::Json) {
        throw Failure(kWrongUsage, "--watch does not go with --json",
                      "zavctl --json events shows outcomes as they come.");
    }
    const InterruptNote ending({});
    // Only somebody who asks for an end gets one: the default time-out is that of a task.
    const Deadline end = invocation.given.has(kTimeout) ? invocation.deadline() : Deadline::max();
    View view;
    while (std::ferror(stdout) == 0) {
        try {
            view.show(look());
        } catch (const Failure& failure) {
            if (!view.hasShown() || failure.status() != kNoHost) throw;
            view.showAway(failure);
        }
        const auto left = end - std::chrono::steady_clock::now();
        if (left <= left.zero()) break;
        std::this_thread::sleep_for(
            std::min<std::chrono::nanoseconds>(left, std::chrono::seconds(1)));
    }
    return kSuccess;
}

}  // namespace ctl
