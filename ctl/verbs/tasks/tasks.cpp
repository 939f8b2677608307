#include "ctl/verbs/tasks/tasks.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <thread>

#include "ctl/client/interruption.h"
#include "ctl/client/tasks/task_list.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kState =
    textOption("--state",
               "Only those in this state: queued, running, done, failed, refused, cancelled,\n"
               "expired or interrupted");
constexpr Argument kOfProduct =
    textOption("--product", "Only those for this product").completedBy(Completion::Product);
constexpr Argument kLimit =
    numberOption("--limit", "At most so many").between(1, 1e6).otherwise("20");
constexpr Argument kWatch = flag("--watch", "Show the list anew each second until Ctrl-C");
constexpr Argument kArguments[] = {kState, kOfProduct, kLimit, kWatch};

TaskFilter filterOf(const Values& given) {
    return {given.text(kState), given.text(kOfProduct), given.number(kLimit)};
}

json askTasks(const Invocation& invocation) {
    return listTasks(HostClient(invocation.host.socket), filterOf(invocation.given),
                     invocation.deadline());
}

/// Shows lists on a terminal in place of each other, elsewhere below each other when something has
/// changed.
class ListView {
public:
    void show(const json& list) {
        const Page page = showTasks(list, std::chrono::system_clock::now(), Format::Text);
        if (isTerminal_) {
            print({"\x1b[H\x1b[2J" + page.out, page.err});
        } else if (list != shown_) {
            print({(shown_.is_null() ? "" : "\n") + page.out, page.err});
        }
        shown_ = list;
        isAway_ = false;
    }
    void showAway(const Failure& failure) {
        if (!isAway_) print({{}, complaint(std::string("note: ") + failure.what())});
        isAway_ = true;
    }
    bool hasShown() const { return !shown_.is_null(); }

private:
    bool isTerminal_ = ::isatty(STDOUT_FILENO) == 1;
    bool isAway_ = false;
    json shown_;
};

ExitStatus watch(const Invocation& invocation) {
    const InterruptNote ending({});
    // Only somebody who asks for an end gets one: the default time-out is that of a task.
    const Deadline end = invocation.given.has(kTimeout) ? invocation.deadline() : Deadline::max();
    ListView view;
    while (std::ferror(stdout) == 0) {
        try {
            view.show(askTasks(invocation));
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

ExitStatus run(const Invocation& invocation) {
    if (invocation.given.flag(kWatch)) {
        if (invocation.format == Format::Json) {
            throw Failure(kWrongUsage, "--watch does not go with --json",
                          "zavctl --json events shows outcomes as they come.");
        }
        return watch(invocation);
    }
    return print(
        showTasks(askTasks(invocation), std::chrono::system_clock::now(), invocation.format));
}

}  // namespace

constexpr Verb kTasksVerb = {
    "tasks",    "List what the host was asked for, and how it ended",
    kArguments, {"zavctl tasks --state failed", "zavctl tasks --product ux --limit 5 --watch"},
    run,
};

Page showTasks(const json& list, WallTime now, Format format) {
    if (format == Format::Json) return jsonPage(list);
    const json& tasks = list.at("tasks");
    if (tasks.empty()) return {"There are no such tasks.\n", {}};
    std::string text = taskTable(tasks, now);
    if (!list.at("next").is_null()) text += "There are more; see --limit.\n";
    return {text, {}};
}

}  // namespace ctl
