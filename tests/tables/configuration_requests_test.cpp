// ctest-label: threaded
// Requests about configurations and instances from end to end: in through the request table,
// through the executor and the real handlers, out through the request table's answer or the deploy
// status table.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "support/fake_sleep.h"
#include "support/host/outcomes.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tables/zav01agt.h"
#include "tasks/task_home.h"
#include "tasks/zavtasks.h"

namespace {

constexpr const char* kConsole = "bin/um_console";
constexpr const char* kAgent = "bin/TovrinAgent";

using Values = std::map<std::string, std::string>;

template <typename Row>
Outcome outcomeIn(const Row& row) {
    return {row.retval, trimmedField(row.retmsgid), trimmedField(row.retmsgparm)};
}

/// A failure as a row shows it: the parameter is truncated to its column.
Outcome failure(int code, const std::string& parameter) {
    return {code, "ZAV" + std::to_string(code) + "E", parameter.substr(0, 256)};
}

class Requests : public testing::Test {
protected:
    Requests() {
        fake_sleep::reset();
        home_.program(kAgent, "true");
        ::setenv("TOVRINHOME", home_.home().c_str(), 1);
        ::setenv("QVSDEPLOY_AGENTDEPOT", home_.depot().c_str(), 1);
        if (zav_kagreqt_static_manager == nullptr) zav_kagreqt_init();
        zav_taskmgr_init();
    }

    static std::vector<oxa::Predicate> where(const Values& values) {
        std::vector<oxa::Predicate> predicates;
        for (const auto& [column, value] : values)
            predicates.push_back({column, OPER_EQ, value});
        return predicates;
    }

    /// The one row that answers a request.
    static Outcome answer(Values values) {
        values["TRANSID"] = "tx-1";
        oxa::Rows rows;
        EXPECT_EQ(oxa::query("KAGREQT", where(values), rows), 0);
        if (rows.count() != 1) return {-1, "no answer", ""};
        zav_kagreqt_data_t row;
        std::memcpy(&row, rows.row(0), sizeof row);
        return outcomeIn(row);
    }

    /// The one row that reports the outcome of an accepted request.
    static Outcome outcome(const Values& values) {
        Outcomes outcomes({{"TRANSID", OPER_EQ, "tx-1"}});
        EXPECT_EQ(answer(values), kSuccess);
        const auto rows = outcomes.waitFor(1);
        return rows.size() == 1 ? outcomeIn(rows[0]) : Outcome{-1, "no outcome", ""};
    }

    std::string translatorPath() const { return home_.home() + "/" + TaskHome::kTranslator; }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

// ---- Instances ----------------------------------------------------------------------------------

TEST_F(Requests, ActOnTheInstanceThatTheTranslatorNames) {
    home_.translator("echo ' inst1 '");
    for (const char* command : {"START", "STOP", "RESTART"}) {
        EXPECT_EQ(
            outcome({{"COMMAND", command}, {"PRODUCT", "ux"}, {"TARGETMSN", "inst1:hostA:UX"}}),
            kSuccess);
    }
    const std::string start = "[-h][" + home_.home() + "][-o][inst1][start][ux]";
    const std::string stop = "[-h][" + home_.home() + "][-c][-o][inst1][stop][ux]";
    EXPECT_THAT(home_.calls(kAgent), testing::ElementsAre(start, stop, stop, start));
    EXPECT_THAT(
        home_.calls(TaskHome::kTranslator),
        testing::ElementsAre("[-i][inst1:hostA:UX][-pc][ux]", "[-i][inst1:hostA:UX][-pc][ux]",
                             "[-i][inst1:hostA:UX][-pc][ux]"));
}

TEST_F(Requests, ActOnNoInstanceWithoutATranslator) {
    home_.inventory(TaskHome::listHeader());
    for (const char* command : {"START", "STOP"}) {
        EXPECT_EQ(
            outcome({{"COMMAND", command}, {"PRODUCT", "ux"}, {"TARGETMSN", "inst1:hostA:UX"}}),
            kSuccess);
    }
    EXPECT_THAT(home_.calls(kAgent),
                testing::ElementsAre("[-h][" + home_.home() + "][start][ux]",
                                     "[-h][" + home_.home() + "][-c][stop][ux]"));
    EXPECT_EQ(trace_.count('E', "No two-way translator found for product code [ux]"), 2);
    EXPECT_EQ(trace_.count('D', "Returning instance [] for managed system name [inst1:hostA:UX]"),
              2);
}

// ---- The translator -----------------------------------------------------------------------------

class TranslatorRequests : public Requests {
protected:
    static Outcome get() { return answer({{"COMMAND", "GETCONFIG"}, {"PRODUCT", "ux"}}); }
    static Outcome set() {
        return outcome({{"COMMAND", "SETCONFIG"}, {"PRODUCT", "ux"}, {"CONTEXT", "A=1"}});
    }
    static Outcome remove() {
        return outcome({{"COMMAND", "REMOVEINSTANCE"}, {"PRODUCT", "ux"}, {"TARGETMSN", "i:UX"}});
    }
};

TEST_F(TranslatorRequests, NeedATranslator) {
    home_.inventory(TaskHome::listHeader());
    EXPECT_EQ(get(), failure(1007, "GETCONFIG,ux"));
    EXPECT_EQ(set(), failure(1007, "SETCONFIG,ux"));
    EXPECT_EQ(remove(), failure(1007, "REMOVEINSTANCE,ux"));
}

TEST_F(TranslatorRequests, ReportATranslatorThatFails) {
    home_.translator("echo wrong >&2; exit 3");
    EXPECT_EQ(get(), failure(1008, "GETCONFIG,ux,3," + translatorPath() + " -g  -pc ux"));
    EXPECT_EQ(set(), failure(1008, "SETCONFIG,ux,3," + translatorPath() + " -p  -pc ux,wrong\n"));
    EXPECT_EQ(remove(),
              failure(1008, "REMOVEINSTANCE,ux,3," + translatorPath() + " -r i:UX -pc ux"));
}

TEST_F(TranslatorRequests, ReportATranslatorThatCannotRun) {
    home_.translator("true");
    home_.notExecutable(TaskHome::kTranslator);
    EXPECT_EQ(get(), failure(1009, "GETCONFIG,ux," + translatorPath() + " -g  -pc ux"));
    EXPECT_EQ(set(), failure(1009, "SETCONFIG,ux," + translatorPath() + " -p  -pc ux"));
    EXPECT_EQ(remove(), failure(1009, "REMOVEINSTANCE,ux," + translatorPath() + " -r i:UX -pc ux"));
}

// ---- The universal agent ------------------------------------------------------------------------

class UniversalAgentRequests : public Requests {
public:
    UniversalAgentRequests() {
        home_.inventory("", "Platform codes:\nli6263 Product (um)\n");
        home_.dir().makeDir("home/metafiles");
        home_.dir().makeDir("home/work/scripts");
        home_.dir().write("depot/app.mdl", "//APPL\n");
        home_.dir().write("home/config/.ConfigData/kumenv", "|DATAPROVIDER|SNMP|\n");
        configure({});
        console("[ $verb != getdptype ] || echo SOCK");
    }

    /// Writes the default instance's configuration with these values; an empty one leaves the key
    /// out.
    void configure(const Values& changes) const {
        Values values{{"KUMP_META_PATH", home_.home() + "/metafiles"},
                      {"KUM_WORK_PATH", home_.home() + "/work/um"},
                      {"KUMP_RB_PATH", home_.home() + "/rb"},
                      {"KUMA_STARTUP_DP", "SNMP"}};
        std::string content;
        for (const auto& [key, value] : changes)
            values[key] = value;
        for (const auto& [key, value] : values) {
            if (!value.empty()) content += key + "=" + value + "\n";
        }
        home_.dir().write("home/config/um.config", content);
    }
    /// Creates a console that runs `body` with its verb in "$verb".
    void console(const std::string& body) const {
        home_.program(kConsole, "verb=${4%% *}\n" + body);
    }
    void agent(const std::string& body) const { home_.program(kAgent, body); }
    void remove(const std::string& path) const { std::filesystem::remove(home() + path); }
    void productIsNotInstalled() const { home_.inventory("", "Platform codes:\n"); }

    const std::string& home() const { return home_.home(); }
    std::string configFile() const { return home() + "/config/um.config"; }
    std::string consoleCommand(const std::string& verb) const {
        return home() + "/bin/um_console -h " + home() + " -c \"" + verb + " " + home() +
               "/metafiles/app.mdl\"";
    }
    std::string depotFile(const std::string& name) const { return home_.depot() + name; }

protected:
    static Outcome importMetafile(const Values& extra) {
        Values values{{"COMMAND", "SETCONFIG"}, {"PRODUCT", "um"}, {"UACONFIG", "app.mdl"}};
        values.insert(extra.begin(), extra.end());
        return outcome(values);
    }
};

TEST_F(UniversalAgentRequests, ImportAMetafile) {
    EXPECT_EQ(importMetafile({{"CONTEXT", "restart=y"}}), kSuccess);
    EXPECT_EQ(home_.dir().read("home/config/.ConfigData/kumenv"), "|DATAPROVIDER|SNMP,SOCK|\n");
    EXPECT_THAT(home_.calls(kConsole), testing::SizeIs(3));
}

/// One way in which a metafile cannot be imported.
struct Failing {
    int code;
    std::function<void(const UniversalAgentRequests& test)> arrange;
    Values request;
    std::function<std::string(const UniversalAgentRequests& test)> parameter;
};

std::ostream& operator<<(std::ostream& out, const Failing& failing) {
    return out << failing.code;
}

using Test = UniversalAgentRequests;

void changeNothing(const Test&) {}

std::function<void(const Test&)> withoutKey(const char* key) {
    return [key](const Test& test) { test.configure({{key, ""}}); };
}

std::function<std::string(const Test&)> keyAndFile(const char* key) {
    return [key](const Test& test) { return key + ("," + test.configFile()); };
}

std::function<std::string(const Test&)> text(const char* parameter) {
    return [parameter](const Test&) { return parameter; };
}

std::function<std::string(const Test&)> command(const char* verb) {
    return [verb](const Test& test) { return test.consoleCommand(verb); };
}

const Values kRestart{{"CONTEXT", "RESTART=Y"}};

std::vector<Failing> failures() {
    return {
        {1011, withoutKey("KUMP_META_PATH"), {}, keyAndFile("KUMP_META_PATH")},
        {1012, withoutKey("KUM_WORK_PATH"), {}, keyAndFile("KUM_WORK_PATH")},
        {1013, withoutKey("KUMP_RB_PATH"), {}, keyAndFile("KUMP_RB_PATH")},
        {1014,
         [](const Test& test) { std::filesystem::remove(test.depotFile("app.mdl")); },
         {},
         [](const Test& test) {
             return test.depotFile("app.mdl") + "," + test.home() + "/metafiles";
         }},
        {1015,
         changeNothing,
         {{"UASCRIPT", "none.sh"}},
         [](const Test& test) {
             return test.depotFile("none.sh") + "," + test.home() + "/work/scripts";
         }},
        {1016, [](const Test& test) { test.console("[ $verb != IMPORT ]"); }, {}, text("app.mdl")},
        {1017, [](const Test& test) { test.remove("/bin/um_console"); }, {}, command("DELETE")},
        {1018, [](const Test& test) { test.console("chmod 644 $0"); }, {}, command("IMPORT")},
        {1019, &Test::productIsNotInstalled, {}, text("um")},
        {1020,
         [](const Test& test) { test.remove("/config/um.config"); },
         {{"TARGETMSN", "Inst1:hostA:UA"}},
         [](const Test& test) { return test.home() + "/config/um_inst1.config,inst1"; }},
        {1021,
         [](const Test& test) {
             test.configure({{"KUM_WORK_PATH", "work"}});
         },
         {},
         [](const Test& test) { return "KUM_WORK_PATH,work," + test.configFile(); }},
        {1022, [](const Test& test) { test.remove("/bin/um_console"); }, kRestart,
         command("getdptype")},
        {1023, [](const Test& test) { test.console("[ $verb != getdptype ]"); }, kRestart,
         text("app.mdl")},
        {1026, [](const Test& test) { test.agent("case \"$*\" in *start*) exit 1;; esac"); },
         kRestart, text("")},
        {1027, [](const Test& test) { test.agent("exit 1"); }, kRestart, text("")},
        {1028, [](const Test& test) { test.remove("/config/.ConfigData/kumenv"); }, kRestart,
         [](const Test& test) { return test.home() + "/config/.ConfigData/kumenv,SNMP,SOCK"; }},
    };
}

class FailingRequests : public UniversalAgentRequests,
                        public testing::WithParamInterface<Failing> {};

TEST_P(FailingRequests, AreReportedWithTheirCodeAndParameter) {
    GetParam().arrange(*this);
    EXPECT_EQ(importMetafile(GetParam().request),
              failure(GetParam().code, GetParam().parameter(*this)));
}

INSTANTIATE_TEST_SUITE_P(AllCodes, FailingRequests, testing::ValuesIn(failures()),
                         [](const testing::TestParamInfo<Failing>& tested) {
                             return std::to_string(tested.param.code);
                         });

}  // namespace
