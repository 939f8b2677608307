// Commands that only look: query, agents, events, status.

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <csignal>
#include <cstdio>
#include <memory>
#include <nlohmann/json.hpp>

#include "ctl/client/condition_text.h"
#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/options.h"
#include "ctl/show/rows.h"
#include "ctl/verbs/commands.h"

using nlohmann::json;

namespace ctl {
namespace {

Deadline deadlineOf(const Options& options) {
    return std::chrono::steady_clock::now() + options.timeout();
}

int runQuery(const Options& options, const std::string& table,
             const std::vector<std::string>& conditions) {
    std::vector<Condition> where;
    for (const std::string& text : conditions)
        where.push_back(parseCondition(text));
    const json rows = HostClient(options.socket).query(table, where, deadlineOf(options));
    if (options.json) {
        printJson({{"rows", rows}});
    } else {
        printRecords(rows);
        std::printf("%s%zu row%s\n", rows.empty() ? "" : "\n", rows.size(),
                    rows.size() == 1 ? "" : "s");
    }
    return kSuccess;
}

int runAgents(const Options& options, const std::string& product, const std::string& platform) {
    std::vector<Condition> where;
    if (!product.empty()) where.push_back({"PRODUCT", "=", product});
    if (!platform.empty()) where.push_back({"PLATFORM", "=", platform});
    const json rows = HostClient(options.socket).query("KINAGT", where, deadlineOf(options));
    if (options.json) {
        printJson({{"rows", rows}});
    } else if (rows.empty()) {
        std::printf("No products are listed.\n");
    } else {
        printTable(rows, {{"PRODUCT", "PRODUCT"},
                          {"VERSION", "VERSION"},
                          {"RELEASE", "RELEASE"},
                          {"PLATFORM", "PLATFORM"},
                          {"HOSTTYPE", "SYSTEM"},
                          {"HOSTPC", "ARCHITECTURE"},
                          {"PRODDESC", "DESCRIPTION"}});
    }
    return kSuccess;
}

/// An interrupted stream is a finished one: the document is closed, the status is success. Only
/// async-signal-safe calls; every event has been flushed.
void endDocument(int) {
    static const char kEnd[] = "\n]}\n";
    [[maybe_unused]] const ssize_t written = ::write(STDOUT_FILENO, kEnd, sizeof kEnd - 1);
    ::_exit(kSuccess);
}

void endStream(int) {
    ::_exit(kSuccess);
}

/// Prints events as they come; as JSON they are the elements of one document.
class EventPrinter {
public:
    explicit EventPrinter(bool asJson) : asJson_(asJson) {
        if (asJson_) std::printf("{\"events\": [");
        std::fflush(stdout);
    }
    ~EventPrinter() {
        if (asJson_) std::printf("%s]}\n", count_ > 0 ? "\n" : "");
        std::fflush(stdout);
    }
    /// False when nobody reads the output any more.
    bool print(const json& row) {
        if (asJson_) {
            std::printf("%s\n  %s", count_ > 0 ? "," : "",
                        row.dump(-1, ' ', false, json::error_handler_t::replace).c_str());
        } else {
            const int rc = returnCodeOf(row);
            std::printf("%s  %s  %s%s%s\n", textOf(row, "TRANSID").c_str(),
                        textOf(row, "COMMAND").c_str(), rc == 0 ? "done" : "failed; ",
                        rc == 0 ? "" : describeRow(row).c_str(),
                        textOf(row, "TARGETMSN").empty()
                            ? ""
                            : ("  target " + textOf(row, "TARGETMSN")).c_str());
        }
        ++count_;
        return std::fflush(stdout) == 0;
    }
    unsigned count() const { return count_; }

private:
    bool asJson_;
    unsigned count_ = 0;
};

int streamEvents(const Options& options, EventStream& stream, unsigned wanted) {
    const Deadline end = options.timeoutSeconds ? deadlineOf(options) : Deadline::max();
    EventPrinter printer(options.json);
    while (wanted == 0 || printer.count() < wanted) {
        ServerEvent event;
        const auto result = stream.next(end, event);
        if (result == EventStream::Result::TimedOut) return wanted == 0 ? kSuccess : kNoOutcome;
        if (result == EventStream::Result::Ended) {
            std::fprintf(stderr, "zavctl: the host closed the stream\n");
            return kNoHost;
        }
        const json row = json::parse(event.data, nullptr, false);
        if (event.type != "message") {
            std::fprintf(stderr, "zavctl: %s: %s\n", event.type.c_str(), event.data.c_str());
        } else if (row.is_object()) {
            if (!printer.print(row)) return kSuccess;
        }
    }
    return kSuccess;
}

int runEvents(const Options& options, const std::string& transid, unsigned count) {
    std::vector<std::pair<std::string, std::string>> where;
    if (!transid.empty()) where.emplace_back("TRANSID", transid);
    EventStream stream(options.socket, "KAGDYST", where, deadlineOf(options));
    std::signal(SIGINT, options.json ? endDocument : endStream);
    std::signal(SIGTERM, options.json ? endDocument : endStream);
    return streamEvents(options, stream, count);
}

int runStatus(const Options& options) {
    const json health = HostClient(options.socket).get("/v1/health", deadlineOf(options));
    if (options.json) {
        printJson(health);
    } else {
        printRecords(json::array({health}));
    }
    return kSuccess;
}

}  // namespace

void addInformationCommands(CLI::App& app, const Options& options, int& status) {
    auto table = std::make_shared<std::string>();
    auto conditions = std::make_shared<std::vector<std::string>>();
    CLI::App* query = app.add_subcommand("query", "Query a table");
    query->add_option("TABLE", *table, "KAGREQT, KINAGT or KAGDYST")->required();
    query->add_option("CONDITION", *conditions,
                      "COLUMN=VALUE; also !=, <, <=, > and >=, and ~ for a pattern with *");
    query->callback([=, &options, &status] { status = runQuery(options, *table, *conditions); });

    auto product = std::make_shared<std::string>();
    auto platform = std::make_shared<std::string>();
    CLI::App* agents = app.add_subcommand("agents", "List the products installed on the host");
    agents->add_option("--product", *product, "Only this product code");
    agents->add_option("--platform", *platform, "Only this platform");
    agents->callback([=, &options, &status] { status = runAgents(options, *product, *platform); });

    auto transid = std::make_shared<std::string>();
    auto count = std::make_shared<unsigned>(0);
    CLI::App* events = app.add_subcommand("events", "Show the outcomes of tasks as they come");
    events->add_option("--transid", *transid, "Only this transaction");
    events->add_option("--count", *count, "End after so many");
    events->callback([=, &options, &status] { status = runEvents(options, *transid, *count); });

    CLI::App* health = app.add_subcommand("status", "Show how the host is");
    health->callback([&options, &status] { status = runStatus(options); });
}

}  // namespace ctl
