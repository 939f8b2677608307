// Every document of a host's with every one of its values replaced by something odd: what shows it
// throws nothing but Failure, and lets no control character through.

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <nlohmann/json.hpp>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/show/tasks/task_record.h"
#include "ctl/verbs/agents.h"
#include "ctl/verbs/commands/complete_install.h"
#include "ctl/verbs/config/config_get.h"
#include "ctl/verbs/depot/depot_ls.h"
#include "ctl/verbs/depot/depot_sum.h"
#include "ctl/verbs/events.h"
#include "ctl/verbs/host/doctor.h"
#include "ctl/verbs/host/status.h"
#include "ctl/verbs/host/top.h"
#include "ctl/verbs/host/version.h"
#include "ctl/verbs/query.h"
#include "ctl/verbs/tasks/task_cancel.h"
#include "ctl/verbs/tasks/task_wait.h"
#include "ctl/verbs/tasks/tasks.h"

namespace {

using ctl::Format;
using ctl::Page;
using nlohmann::json;

using Show = std::function<Page(const json& document, Format format)>;

const json kCommand = {
    {"command", "/bin/sh"}, {"pid", 7},         {"started", "2030-01-02T03:04:05Z"},
    {"ended", nullptr},     {"exit", 3},        {"timed_out", false},
    {"stdout", "a\nb"},     {"stderr", "c\r\n"}};
const json kRow = {{"TRANSID", "T"},         {"COMMAND", "GETCONFIG"}, {"PRODUCT", "ux"},
                   {"CONTEXT", "INSTANCE="}, {"RETVAL", 1024},         {"RETMSGID", "ZAV1024E"},
                   {"RETMSGPARM", "x"},      {"TARGETMSN", "a:h:UX"},  {"VERSION", "063000000"}};
const json kTask = {{"id", "17"},
                    {"transid", "T"},
                    {"command", "INSTALL"},
                    {"product", "ux"},
                    {"version", "6.3"},
                    {"state", "failed"},
                    {"accepted", "2030-01-02T03:04:05Z"},
                    {"started", "2030-01-02T03:04:05.5Z"},
                    {"asker", "root"},
                    {"reply", kRow},
                    {"events", {kRow}},
                    {"details", {{"commands", {kCommand}}}}};

void collectPaths(const json& document, const json::json_pointer& at,
                  std::vector<json::json_pointer>& paths) {
    paths.push_back(at);
    if (document.is_object()) {
        for (const auto& member : document.items())
            collectPaths(member.value(), at / member.key(), paths);
    } else if (document.is_array()) {
        for (std::size_t i = 0; i < document.size(); ++i)
            collectPaths(document[i], at / i, paths);
    }
}

bool isControl(char c) {
    return c != '\n' && (static_cast<unsigned char>(c) < 0x20 || c == 0x7F);
}

void expectPlain(const std::string& text, const json& document) {
    EXPECT_TRUE(std::none_of(text.begin(), text.end(), isControl)) << document << "\n" << text;
    EXPECT_EQ(text.find("\xc2\x9b"), std::string::npos) << document;
}

void tryToShow(const json& document, const Show& show) {
    for (const Format format : {Format::Text, Format::Json}) {
        try {
            const Page page = show(document, format);
            expectPlain(page.out, document);
            expectPlain(page.err, document);
        } catch (const ctl::Failure& failure) {
            EXPECT_STRNE(failure.what(), "") << document;
        } catch (const std::exception& error) {
            ADD_FAILURE() << error.what() << " of " << document;
        }
    }
}

/// How many documents were tried.
std::size_t tryAllVariants(const json& document, const Show& show) {
    const json odd[] = {nullptr,
                        true,
                        -1,
                        18446744073709551615ULL,
                        1e300,
                        "\x1b[2J\xc2\x9b\x07\r\n",
                        json::array(),
                        json::object(),
                        json::array({json::array({7, nullptr})}),
                        json{{"\x1b", {{"commands", 7}}}}};
    std::vector<json::json_pointer> paths;
    collectPaths(document, json::json_pointer(), paths);
    std::size_t tried = 0;
    for (const json::json_pointer& path : paths) {
        for (const json& value : odd) {
            json variant = document;
            variant[path] = value;
            tryToShow(variant, show);
            ++tried;
        }
    }
    return tried;
}

/// The parts of an answer as the client hands them on: it checks no more than this.
ctl::QueryAnswer answerOf(const json& document) {
    const auto listIn = [&document](const char* name) {
        const auto found = document.find(name);
        return found != document.end() && found->is_array() ? *found : json::array();
    };
    const json rows = listIn("rows");
    const bool areRows =
        std::all_of(rows.begin(), rows.end(), [](const json& row) { return row.is_object(); });
    if (!areRows) throw ctl::Failure(ctl::kNoHost, "no rows");
    return {rows, listIn("warnings"), listIn("full")};
}

TEST(OddDocuments, OfAQueryAreShownOrRefused) {
    json warning = kCommand;
    warning["text"] = "it failed";
    const json answer = {{"rows", {kRow, kRow}}, {"warnings", {warning}}};
    EXPECT_GT(tryAllVariants(answer,
                             [](const json& document, Format format) {
                                 return ctl::showAgents({answerOf(document)}, format);
                             }),
              200U);
    for (const char* table : {"KINAGT", "KAGREQT"}) {
        tryAllVariants(answer, [table](const json& document, Format format) {
            return ctl::showQuery({table, {}}, answerOf(document), format);
        });
    }
}

TEST(OddDocuments, OfAConfigurationAreShownOrRefused) {
    const json answer = {
        {"rows", {kRow}},
        {"full", {{{"row", 0}, {"column", "CONTEXT"}, {"text", "A=1"}, {"complete", true}}}},
        {"record", kTask}};
    for (const int retval : {0, 1024}) {
        json document = answer;
        document["rows"][0]["RETVAL"] = retval;
        tryAllVariants(document, [](const json& variant, Format format) {
            const ctl::QueryAnswer given = answerOf(variant);
            if (given.rows.empty()) throw ctl::Failure(ctl::kHostReportedFailure, "no rows");
            ctl::Configuration configuration = ctl::configurationIn(given);
            if (variant.contains("record")) configuration.record = variant["record"];
            Page page = ctl::showConfiguration("ux", configuration, format);
            // Somebody's own text goes out as it is, and to a terminal by another way.
            if (page.isVerbatim) page.out.clear();
            return page;
        });
    }
}

TEST(OddDocuments, AboutTheDepotAreShownOrRefused) {
    const json listing = {
        {"path", ""},
        {"type", "directory"},
        {"entries",
         {{{"name", "a"}, {"type", "file"}, {"bytes", 1}, {"modified", "2030-01-02T03:04:05Z"}}}},
        {"complete", false}};
    for (const bool isLong : {false, true}) {
        tryAllVariants(listing, [isLong](const json& document, Format format) {
            return ctl::showDepot(document, isLong, format, {});
        });
    }
    const json sums = {{{"path", "a"}, {"sha256", "aa"}}, {{"path", "b"}, {"error", "none"}}};
    tryAllVariants(sums, [](const json& document, Format format) {
        return ctl::showSums(document.is_array() ? document : json::array(), format);
    });
}

TEST(OddDocuments, AboutTheHostAreShownOrRefused) {
    const json health = {{"version", "1"}, {"uptime_seconds", 7}, {"guarded", true}};
    tryAllVariants(health, ctl::showStatus);
    tryAllVariants(health, [](const json& document, Format format) {
        return ctl::showVersion(document, "/run/host.sock", format);
    });
    tryAllVariants({{{"check", "home"}, {"result", "error"}, {"text", "x"}, {"remedy", "y"}}},
                   ctl::showChecks);
}

TEST(OddDocuments, AboutTheHostAtAGlanceAreShown) {
    const json glance = {
        {"health", {{"version", "1"}, {"home", "/h"}, {"uptime_seconds", 7}, {"guarded", false}}},
        {"ready", {{"ready", false}, {"reasons", {{{"part", "disk"}, {"text", "x"}}}}}},
        {"work", {kTask}},
        {"instances", {{{"target", "h:UX"}, {"state", "running"}, {"user", "root"}, {"pid", 7}}}},
        {"recent", {kTask}}};
    tryAllVariants(glance, [](const json& document, Format) {
        const auto member = [&document](const char* name) {
            return document.is_object() && document.contains(name) ? document[name] : json();
        };
        return ctl::showTop({member("health"), member("ready"), member("work"), member("instances"),
                             member("recent")},
                            {}, 0);
    });
}

TEST(OddDocuments, OfTasksAreShown) {
    tryAllVariants(kTask, [](const json& document, Format) {
        return Page{ctl::recordText(document, {}), ctl::workText(document, {})};
    });
    tryAllVariants(kTask, [](const json& document, Format format) {
        return ctl::showTasks({{"tasks", json::array({document})}, {"next", nullptr}}, {}, format);
    });
    tryAllVariants(kTask, ctl::showCancelled);
    for (const auto end : {ctl::TaskResult::End::Over, ctl::TaskResult::End::TimedOut}) {
        tryAllVariants(kTask, [end](const json& document, Format format) {
            ctl::TaskResult result;
            result.end = end;
            result.record = document;
            return ctl::showAwaited(result, format);
        });
    }
    tryAllVariants({{"row", kRow}, {"record", kTask}}, [](const json& document, Format format) {
        const auto member = [&document](const char* name) {
            return document.is_object() && document.contains(name) ? document[name] : json();
        };
        // The client hands on no other rows.
        if (!member("row").is_object()) throw ctl::Failure(ctl::kNoHost, "no row");
        return ctl::showFetchedOutcome("complete-install", member("row"), member("record"),
                                       std::chrono::seconds(1), format);
    });
    tryAllVariants(kRow, [](const json& document, Format format) {
        return Page{ctl::showEvent(document, true, format), {}};
    });
}

}  // namespace
