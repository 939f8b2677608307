// ctest-label: threaded
// Everything that the host knows about the plug-in, compared with the plug-in as it is shipped.
#include "host/tables/plugin_facts.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <mutex>
#include <set>

#include "embedded/oxa_host.h"
#include "host/process/plugin_loader.h"
#include "host/tables/row_fields.h"
#include "support/fake_sleep.h"
#include "support/host/program.h"
#include "support/host/script_home.h"
#include "support/units.h"
#include "tables/inventory.h"

namespace {

namespace plugin = host::plugin;

constexpr const char* kPlugin = ZAV_BUILD_DIR "/lib/libzavmgmt.so";

/// The plug-in on a home of scripts, started once: it cannot be unloaded, and its executor runs as
/// long as the process.
class Started {
public:
    static Started& once() {
        static Started& instance = *new Started;
        return instance;
    }

    const oxa::Table* find(std::string_view name) const {
        for (const oxa::Table& table : tables_) {
            if (table.name == name) return &table;
        }
        return nullptr;
    }

    /// Asks for the command with all that any queued command requires but this column. Returns the
    /// answer.
    oxa::Rows request(const std::string& command, const std::string& transid,
                      std::string_view without = "") const {
        oxa::Rows rows;
        std::vector<oxa::Predicate> where = {{"COMMAND", OPER_EQ, command},
                                             {"PRODUCT", OPER_EQ, "ux"},
                                             {"VERSION", OPER_EQ, "060100"},
                                             {"TRANSID", OPER_EQ, transid},
                                             {"TARGETMSN", OPER_EQ, "inst:host:UX"}};
        // The other kind answers with a context of its own, which this would filter out.
        if (!plugin::runsAtOnce(command)) where.push_back({"CONTEXT", OPER_EQ, "exit 0"});
        where.erase(std::remove_if(where.begin(), where.end(),
                                   [without](const auto& each) { return each.column == without; }),
                    where.end());
        EXPECT_EQ(oxa::query(std::string(plugin::kRequestTable), where, rows), OXA_OK);
        return rows;
    }
    /// How many outcomes with this TRANSID have been published.
    int outcomes(const std::string& transid) {
        const std::lock_guard<std::mutex> guard(lock_);
        return outcomes_[transid];
    }

private:
    Started() {
        home_.products({"ux"}, "exit 0");
        fake_sleep::reset();
        ::setenv("TOVRINHOME", home_.path().c_str(), 1);
        ::setenv("QVSDEPLOY_AGENTDEPOT", home_.depot().c_str(), 1);
        plugin_.initialize();
        tables_ = oxa::tables();
        live_ =
            oxa::subscribe(std::string(plugin::kOutcomeTable), {}, [this](const oxa::Rows& rows) {
                const oxa::Column& transid =
                    *find(plugin::kOutcomeTable)->find(std::string(plugin::kTransidColumn));
                const std::lock_guard<std::mutex> guard(lock_);
                for (std::size_t i = 0; i < rows.count(); ++i)
                    ++outcomes_[std::string(host::textField(transid, host::rowOf(rows, i)))];
                return static_cast<int>(OXA_OK);
            });
    }

    ScriptHome home_;
    host::Plugin plugin_{std::string(kPlugin)};
    std::vector<oxa::Table> tables_;
    std::mutex lock_;
    std::map<std::string, int> outcomes_;
    std::unique_ptr<oxa::Subscription> live_;
};

void expectColumn(std::string_view tableName, std::string_view columnName, int type) {
    const oxa::Table* const table = Started::once().find(tableName);
    ASSERT_NE(table, nullptr) << tableName;
    const oxa::Column* const column = table->find(std::string(columnName));
    ASSERT_NE(column, nullptr) << columnName;
    EXPECT_EQ(column->type, type) << columnName;
}

TEST(PluginFacts, NameTablesAndColumnsThatThereAre) {
    expectColumn(plugin::kRequestTable, plugin::kTransidColumn, OXA_TYPE_CHARACTER);
    expectColumn(plugin::kRequestTable, plugin::kCommandColumn, OXA_TYPE_CHARACTER);
    expectColumn(plugin::kRequestTable, plugin::kRetvalColumn, OXA_TYPE_INTEGER);
    expectColumn(plugin::kRequestTable, plugin::kProductColumn, OXA_TYPE_CHARACTER);
    expectColumn(plugin::kRequestTable, plugin::kContextColumn, OXA_TYPE_CHARACTER);
    expectColumn(plugin::kRequestTable, plugin::kOptionalColumn, OXA_TYPE_CHARACTER);
    EXPECT_NE(Started::once().find(plugin::kInventoryTable), nullptr);
    expectColumn(plugin::kOutcomeTable, plugin::kTransidColumn, OXA_TYPE_CHARACTER);
    expectColumn(plugin::kOutcomeTable, plugin::kRetvalColumn, OXA_TYPE_INTEGER);
}

TEST(PluginFacts, NameTheShellThatTellsTheArchitecture) {
    const std::string line = narrow(architectureProbeCommand("/h"));
    EXPECT_EQ(line.substr(0, line.find(' ')), plugin::kProbeShell);
}

TEST(PluginFacts, NameEveryColumnOfTheRequestTableOnce) {
    const std::set<std::string_view> known = {plugin::kTransidColumn, plugin::kCommandColumn,
                                              plugin::kProductColumn, plugin::kVersionColumn,
                                              plugin::kTargetColumn,  plugin::kOptionalColumn,
                                              plugin::kContextColumn, plugin::kMetafileColumn,
                                              plugin::kScriptsColumn, plugin::kOriginNodeColumn};
    std::set<std::string_view> all(plugin::kResultColumns.begin(), plugin::kResultColumns.end());
    EXPECT_EQ(all.size(), plugin::kResultColumns.size());
    for (const std::string_view column : known)
        EXPECT_TRUE(all.insert(column).second) << column << " is no result";
    for (const oxa::Column& column : Started::once().find(plugin::kRequestTable)->columns)
        EXPECT_EQ(all.erase(column.name), 1U) << column.name;
    EXPECT_TRUE(all.empty()) << *all.begin();
}

/// What the answer to a request says about its acceptance.
int retvalOf(const oxa::Rows& rows) {
    const oxa::Table& table = *Started::once().find(plugin::kRequestTable);
    const oxa::Column& retval = *table.find(std::string(plugin::kRetvalColumn));
    EXPECT_EQ(rows.count(), 1U);
    return rows.count() == 1 ? host::integerField(retval, host::rowOf(rows, 0)) : -1;
}

/// Its own list of commands, which it exports.
std::vector<std::string> commandsOfPlugin() {
    Started::once();
    void* const library = ::dlopen(kPlugin, RTLD_NOW | RTLD_NOLOAD);
    EXPECT_NE(library, nullptr);
    const auto list = static_cast<std::vector<ZAV::String>**>(::dlsym(library, "commands"));
    std::vector<std::string> found;
    EXPECT_NE(list, nullptr);
    if (list == nullptr) return found;
    for (const ZAV::String& command : **list)
        found.push_back(narrow(command));
    ::dlclose(library);
    return found;
}

TEST(PluginFacts, TellQueuedCommandsFromThoseThatRunAtOnce) {
    Started& started = Started::once();
    int atOnce = 0;
    const std::vector<std::string> commands = commandsOfPlugin();
    EXPECT_EQ(commands.size(), plugin::kQueuedCommands.size() + plugin::kCommandsAtOnce.size());
    for (const std::string& command : commands) {
        const std::string transid = "is-" + command;
        const int retval = retvalOf(started.request(command, transid));
        if (plugin::runsAtOnce(command)) {
            ++atOnce;
            continue;
        }
        EXPECT_EQ(retval, plugin::kAccepted) << command;
        EXPECT_EQ(std::count_if(plugin::kQueuedCommands.begin(), plugin::kQueuedCommands.end(),
                                [&command](const auto& known) { return known.name == command; }),
                  1)
            << command;
        EXPECT_TRUE(eventually([&] { return started.outcomes(transid) == 1; })) << command;
    }
    EXPECT_EQ(plugin::kCommandsAtOnce.size(), static_cast<std::size_t>(atOnce));
    // Outcomes come in the order of the requests, so those of the first two would be there.
    for (const std::string_view command : plugin::kCommandsAtOnce)
        EXPECT_EQ(started.outcomes("is-" + std::string(command)), 0) << command;
}

TEST(PluginFacts, TellWhatAQueuedCommandIsRefusedWithout) {
    Started& started = Started::once();
    for (const plugin::QueuedCommand& command : plugin::kQueuedCommands) {
        for (const std::string_view column : command.required) {
            if (column.empty()) continue;
            const std::string transid = "lacks-" + std::string(column);
            EXPECT_NE(retvalOf(started.request(std::string(command.name), transid, column)),
                      plugin::kAccepted)
                << command.name << " without " << column;
        }
    }
}

TEST(PluginFacts, TellAcceptedRequestsFromRefusedOnes) {
    Started& started = Started::once();
    EXPECT_NE(retvalOf(started.request("NOSUCH", "refused")), plugin::kAccepted);
    EXPECT_EQ(retvalOf(started.request("STOP", "accepted")), plugin::kAccepted);
    EXPECT_TRUE(eventually([&] { return started.outcomes("accepted") == 1; }));
    EXPECT_EQ(started.outcomes("refused"), 0);
}

TEST(PluginFacts, ValuesAreTakenWhateverTheOperator) {
    Started& started = Started::once();
    oxa::Rows rows;
    const std::vector<oxa::Predicate> where = {{"COMMAND", OPER_GE, "STOP"},
                                               {"PRODUCT", OPER_LE, "ux"},
                                               {"TRANSID", OPER_EQ, "compared"},
                                               {"UASCRIPT", OPER_NE, "more than the row holds"}};
    EXPECT_EQ(oxa::query(std::string(plugin::kRequestTable), where, rows), OXA_OK);
    EXPECT_EQ(rows.count(), 0U) << "the row holds the value, so it is not the one that is wanted";
    EXPECT_TRUE(eventually([&] { return started.outcomes("compared") == 1; }));
}

}  // namespace
