// task output: what a task's commands write.

#include <cstdio>
#include <nlohmann/json.hpp>

#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/interruption.h"
#include "ctl/client/row.h"
#include "ctl/show/tasks/output_page.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/task_argument.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kFollow = flag("-f", "Go on until the task is over");
constexpr Argument kArguments[] = {kTask, kFollow};

/// Takes one piece. Returns false when nobody wants more.
using Take = std::function<bool(const json& piece)>;

/// Passes on the pieces until the host says that there are no more.
ExitStatus takeOutput(const Invocation& invocation, const Take& take) {
    const Deadline deadline = invocation.deadline();
    EventStream stream(invocation.host.socket,
                       "/v1/tasks/" + percentEncoded(invocation.given.text(kTask)) + "/output" +
                           (invocation.given.flag(kFollow) ? "?follow=1" : ""),
                       deadline);
    for (;;) {
        ServerEvent event;
        switch (stream.next(deadline, event)) {
            case EventStream::Result::TimedOut:
                return print({{}, complaint("no end within the time-out"), kNoOutcome});
            case EventStream::Result::Ended:
                return print({{}, complaint("the host went away"), kNoHost});
            case EventStream::Result::Event:
                break;
        }
        if (event.type == "end") return kSuccess;
        const json piece = objectIn(event.data);
        if (event.type == "overflow") {
            print({{}, complaint("note: " + textOf(piece, "lost") + " bytes came too fast")});
        }
        if (piece.is_object() && !take(piece)) return kSuccess;
    }
}

ExitStatus run(const Invocation& invocation) {
    const InterruptNote ending({});
    if (invocation.format == Format::Text) {
        OutputPages pages(Format::Text);
        return takeOutput(invocation, [&pages](const json& piece) {
            print(pages.next(textOf(piece, "stream"), textOf(piece, "text")));
            return std::ferror(stdout) == 0;
        });
    }
    json pieces = json::array();
    const ExitStatus status = takeOutput(invocation, [&pieces](const json& piece) {
        pieces.push_back(piece);
        return true;
    });
    return print(jsonPage({{"output", pieces}}, status));
}

}  // namespace

constexpr Verb kTaskOutputVerb = {
    "task output", "Print what the commands of a task have written",
    kArguments,    {"zavctl task output deploy-7", "zavctl task output -f deploy-7"},
    run,
};

}  // namespace ctl
