#include "ctl/verbs/host/top.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/host_client.h"
#include "ctl/client/http/bounded_json.h"
#include "ctl/client/instances.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/task_list.h"
#include "ctl/show/instance_table.h"
#include "ctl/show/printable.h"
#include "ctl/show/tasks/task_record.h"
#include "ctl/show/tasks/task_table.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/ps.h"
#include "ctl/verbs/verb_table.h"
#include "ctl/verbs/watched.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr std::size_t kRecent = 20;
constexpr std::size_t kWaitingShown = 5;
constexpr std::size_t kOutputShown = 5;

/// What a member holds; an empty list if there is none.
json listIn(const json& object, const char* member) {
    const auto found = object.is_object() ? object.find(member) : object.end();
    return found != object.end() && found->is_array() ? *found : json::array();
}

std::string hostLine(const TopFacts& facts) {
    std::string line = "host " + printable(textOf(facts.health, "version")) + " on " +
                       printable(textOf(facts.health, "home")) + ", up " +
                       spanText(std::chrono::seconds(countOf(facts.health, "uptime_seconds")));
    if (!flagOf(facts.health, "guarded", true)) line += ", unguarded";
    if (!facts.ready.is_object()) return line + "\n";
    if (flagOf(facts.ready, "ready", false)) return line + ", ready\n";
    line += ", not ready\n";
    for (const json& reason : listIn(facts.ready, "reasons"))
        line += "  " + printable(textOf(reason, "part") + ": " + textOf(reason, "text")) + "\n";
    return line;
}

/// The last lines of what the task's newest command has written so far.
std::string outputEnd(const json& task) {
    const json commands =
        listIn(task.is_object() ? task.value("details", json()) : json(), "commands");
    if (commands.empty()) return {};
    std::string text = textOf(commands.back(), "stdout");
    if (text.empty()) text = textOf(commands.back(), "stderr");
    std::vector<std::string> lines;
    for (std::size_t begin = 0; begin < text.size();) {
        const std::size_t end = std::min(text.find('\n', begin), text.size());
        lines.push_back(text.substr(begin, end - begin));
        begin = end + 1;
    }
    const std::size_t first = lines.size() - std::min(lines.size(), kOutputShown);
    std::string shown;
    for (std::size_t i = first; i < lines.size(); ++i)
        shown += "  | " + redacted(lines[i]) + "\n";
    return shown;
}

std::string workLines(const json& work, WallTime now) {
    if (!work.is_array() || work.empty()) return "Nothing is at work.\n";
    std::string text;
    std::size_t waiting = 0;
    for (const json& task : work) {
        const bool waits = textOf(task, "state") == "queued";
        if (waits && ++waiting > kWaitingShown) continue;
        text += workText(task, now) + (waits ? "" : outputEnd(task));
    }
    if (waiting > kWaitingShown) {
        text += "and " + std::to_string(waiting - kWaitingShown) + " more that wait\n";
    }
    return text;
}

std::string recentLines(const json& recent, WallTime now) {
    json over = json::array();
    if (recent.is_array()) {
        std::copy_if(recent.begin(), recent.end(), std::back_inserter(over), [](const json& task) {
            const std::string state = textOf(task, "state");
            return state != "queued" && state != "running";
        });
    }
    return over.empty() ? "" : "\n" + taskTable(over, now);
}

std::string firstLines(const std::string& text, std::size_t lines) {
    if (lines == 0) return text;
    std::size_t end = 0;
    while (lines-- > 0 && end < text.size())
        end = std::min(text.find('\n', end), text.size() - 1) + 1;
    return text.substr(0, end);
}

/// Of the terminal, but for the one that the cursor is on; 0 where there is none.
std::size_t terminalLines() {
    winsize size{};
    if (::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) != 0 || size.ws_row < 2) return 0;
    return size.ws_row - 1U;
}

/// Asks the host for it all, but for the instances only now and then: each time costs a process.
class Observer {
public:
    explicit Observer(const Invocation& invocation) : invocation_(invocation) {}

    TopFacts look() {
        const HostClient client(invocation_.host.socket);
        const Deadline deadline = invocation_.deadline();
        TopFacts facts;
        facts.health = client.get("/v1/health", deadline);
        if (!facts.health.is_object()) {
            throw Failure(kNoHost, "the host's answer does not say how it is");
        }
        // With the reasons, where it is not.
        facts.ready = objectIn(client.ask("/v1/ready", deadline).body);
        facts.work = askWork(invocation_);
        facts.recent = listIn(listTasks(client, {{}, {}, kRecent}, deadline), "tasks");
        if (looks_++ % kLooksPerInstances == 0) instances_ = askInstances(client, deadline);
        facts.instances = instances_;
        return facts;
    }

private:
    static constexpr std::size_t kLooksPerInstances = 5;

    /// A home that cannot tell what runs keeps nobody from seeing the rest.
    static json askInstances(const HostClient& client, Deadline deadline) {
        try {
            return listInstances(client, deadline);
        } catch (const Failure&) {
            return nullptr;
        }
    }

    const Invocation& invocation_;
    std::size_t looks_ = 0;
    json instances_;
};

json documentOf(TopFacts facts) {
    return {{"health", std::move(facts.health)},
            {"ready", std::move(facts.ready)},
            {"work", std::move(facts.work)},
            {"instances", std::move(facts.instances)},
            {"recent", std::move(facts.recent)}};
}

ExitStatus run(const Invocation& invocation) {
    Observer observer(invocation);
    if (invocation.format == Format::Json) return print(jsonPage(documentOf(observer.look())));
    return watch(invocation, [&observer] {
        TopFacts facts = observer.look();
        Page page = showTop(facts, std::chrono::system_clock::now(), terminalLines());
        facts.health.erase("uptime_seconds");
        return Look{documentOf(std::move(facts)), std::move(page)};
    });
}

}  // namespace

constexpr Verb kTopVerb = {
    "top", "Watch the host: what it works at, its agents, the newest outcomes",
    {},    {"zavctl top", "zavctl --json top"},
    run,
};

Page showTop(const TopFacts& facts, WallTime now, std::size_t lines) {
    std::string text = hostLine(facts) + "\n" + workLines(facts.work, now);
    const std::string instances =
        facts.instances.is_array() ? instanceTable(facts.instances) : std::string();
    if (!instances.empty()) text += "\n" + instances;
    text += recentLines(facts.recent, now);
    return {firstLines(text, lines)};
}

}  // namespace ctl
