#include "ctl/verbs/events.h"

#include <unistd.h>

#include <csignal>
#include <cstdint>
#include <cstdio>
#include <nlohmann/json.hpp>

#include "ctl/client/http/bounded_json.h"
#include "ctl/client/resumed_events.h"
#include "ctl/client/row.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kOnlyTransid =
    textOption("--transid", "Only this transaction").completedBy(Completion::Transaction);
constexpr Argument kCount = numberOption("--count", "End after so many").between(1, 1e9);
constexpr Argument kSince =
    textOption("--since", "Begin behind the event with this identifier").called("ID");
constexpr Argument kIds = flag("--ids", "Show the identifier of each event");
constexpr Argument kArguments[] = {kOnlyTransid, kCount, kSince, kIds};

/// Shells know a program that was ended by a signal by this status.
constexpr int kSignalled = 128;

/// The document is whole however the stream ends. Makes only async-signal-safe calls. Nothing waits
/// in a buffer, because every event was flushed.
void endDocument(int signal) {
    static const char kEnd[] = "\n]}\n";
    [[maybe_unused]] const ssize_t written = ::write(STDOUT_FILENO, kEnd, sizeof kEnd - 1);
    ::_exit(kSignalled + signal);
}

void endStream(int signal) {
    ::_exit(kSignalled + signal);
}

/// Prints events as they come. As JSON they are one document, which is whole however the stream
/// ends.
class EventPrinter {
public:
    explicit EventPrinter(Format format) : format_(format) {
        if (format_ == Format::Json) print({"{\"events\": [", {}});
    }
    ~EventPrinter() {
        if (format_ == Format::Json) print({count_ > 0 ? "\n]}\n" : "]}\n", {}});
    }
    EventPrinter(const EventPrinter&) = delete;
    EventPrinter& operator=(const EventPrinter&) = delete;

    /// `id` is shown beside the row unless it is empty. Returns false when nobody reads the output
    /// any more.
    bool add(const json& row, const std::string& id) {
        print({showEvent(row, count_ == 0, format_, id), {}});
        ++count_;
        return std::ferror(stdout) == 0;
    }
    unsigned count() const { return count_; }

private:
    Format format_;
    unsigned count_ = 0;
};

/// Somebody who names a number of events wants all of them; else a time-out is an end like any.
ExitStatus atTimeOut(unsigned count, unsigned wanted) {
    if (wanted == 0) return kSuccess;
    return print({{},
                  complaint("only " + std::to_string(count) + " of " + std::to_string(wanted) +
                            " outcomes came within the time-out"),
                  kNoOutcome});
}

/// Prints up to `wanted` events; without end if it is 0.
ExitStatus streamEvents(ResumedEvents& stream, EventPrinter& printer, const Values& given,
                        Deadline end) {
    const unsigned wanted = given.number(kCount);
    while (wanted == 0 || printer.count() < wanted) {
        ServerEvent event;
        const auto result = stream.next(end, event);
        if (result == EventStream::Result::TimedOut) return atTimeOut(printer.count(), wanted);
        if (result == EventStream::Result::Ended) {
            return print({{}, complaint("the host closed the stream"), kNoHost});
        }
        if (event.type != "message") {
            print({{}, complaint(wordsFor(event))});
            continue;
        }
        const json row = objectIn(event.data);
        const std::string id = given.flag(kIds) ? event.id : std::string();
        if (row.is_object() && !printer.add(row, id)) break;
    }
    return kSuccess;
}

void sayThatItIsLost() {
    print({{}, complaint("the connection to the host is lost; trying again")});
}

ExitStatus run(const Invocation& invocation) {
    const Values& given = invocation.given;
    std::vector<std::pair<std::string, std::string>> where;
    if (!given.text(kOnlyTransid).empty()) where.emplace_back("TRANSID", given.text(kOnlyTransid));
    ResumedEvents stream(
        {invocation.host.socket, where, given.text(kSince), invocation.host.timeout},
        invocation.deadline());
    stream.onLoss = sayThatItIsLost;
    const bool isJson = invocation.format == Format::Json;
    std::signal(SIGINT, isJson ? endDocument : endStream);
    std::signal(SIGTERM, isJson ? endDocument : endStream);
    // Only somebody who asks for an end gets one: the default time-out is that of a task.
    const Deadline end = given.has(kTimeout) ? invocation.deadline() : Deadline::max();
    EventPrinter printer(invocation.format);
    try {
        return streamEvents(stream, printer, given, end);
    } catch (const Failure& failure) {
        // As JSON the document has begun already, and there is only one.
        return print(failurePage(failure, Format::Text));
    }
}

}  // namespace

constexpr Verb kEventsVerb = {
    "events",   "Show the outcomes of tasks as they come",
    kArguments, {"zavctl events", "zavctl --json --timeout 60 events --transid deploy-7 --count 1"},
    run,
};

std::string wordsFor(const ServerEvent& event) {
    if (event.type != "gap") return event.type + ": " + event.data;
    const json gap = objectIn(event.data);
    const auto missing = gap.find("missing");
    if (missing == gap.end() || !missing->is_number_unsigned()) {
        return "the host does not know that identifier: it has another journal. Some events may be "
               "missing; those that it keeps follow";
    }
    const auto count = missing->get<std::uint64_t>();
    return std::to_string(count) + (count == 1 ? " event is" : " events are") +
           " missing here: the host does not keep " + (count == 1 ? "it" : "them") + " any more";
}

std::string showEvent(const json& row, bool isFirst, Format format, const std::string& id) {
    if (format == Format::Json) {
        json shown = row;
        if (!id.empty()) shown["id"] = id;
        return std::string(isFirst ? "" : ",") + "\n  " + jsonLine(shown);
    }
    std::string line = id.empty() ? "" : id + "  ";
    line += textOf(row, "TRANSID") + "  " + textOf(row, "COMMAND") + "  ";
    line += returnCodeOf(row) == 0 ? "done" : "failed; " + describeRow(row);
    const std::string target = textOf(row, "TARGETMSN");
    if (!target.empty()) line += "  target " + target;
    return printable(line) + "\n";
}

}  // namespace ctl
