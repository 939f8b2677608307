// ctest-label: threaded
// The lines that the host listens for, compared with the plug-in as it is shipped.
#include "host/commands/trace_texts.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "embedded/ras1_listener.h"
#include "host/commands/ear.h"
#include "host/process/plugin_loader.h"
#include "support/fake_sleep.h"
#include "support/host/script_home.h"
#include "support/process/vfork.h"
#include "support/scoped_env.h"

namespace {

namespace trace = host::trace;

/// Everything that the units trace outside of children, which must not allocate.
class Lines final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override {
        if (inChild(line)) return;
        const std::lock_guard<std::mutex> lock(lock_);
        lines_.insert(std::string(line.unit) + '|' + line.function + '|' +
                      std::string(line.text, line.length));
    }
    /// Whether the function, or any if it is empty, traced a line that begins so.
    bool heard(const char* unit, std::string_view text, std::string_view function = {}) const {
        const std::lock_guard<std::mutex> lock(lock_);
        for (const std::string& line : lines_) {
            const std::size_t first = line.find('|');
            const std::size_t second = line.find('|', first + 1);
            if (line.compare(0, first, unit) != 0) continue;
            if (line.compare(second + 1, text.size(), text) != 0) continue;
            if (function.empty() || line.compare(first + 1, second - first - 1, function) == 0) {
                return true;
            }
        }
        return false;
    }
    bool entered = false;
    bool connected = false;
    bool notExecuted = false;

private:
    /// The flags are memory that was set aside.
    bool inChild(const ras1::HeardLine& line) noexcept {
        const std::string_view text(line.text, line.length);
        if (text.substr(0, trace::kInChild.size()) == trace::kInChild) return entered = true;
        if (text.substr(0, trace::kNotExecuted.size()) == trace::kNotExecuted) {
            return notExecuted = true;
        }
        if (text == trace::kConnected) return connected = true;
        return false;
    }

    mutable std::mutex lock_;
    std::set<std::string> lines_;
};

void ask(const std::string& table, const std::vector<oxa::Predicate>& where) {
    oxa::Rows rows;
    EXPECT_EQ(oxa::query(table, where, rows), OXA_OK);
}

void getConfiguration() {
    ask("KAGREQT",
        {{"COMMAND", OPER_EQ, "GETCONFIG"}, {"PRODUCT", OPER_EQ, "ux"}, {"TRANSID", OPER_EQ, "t"}});
}

TEST(TraceTexts, AreThoseOfThePlugin) {
    ScriptHome home;
    const ScopedEnv homeSetting("TOVRINHOME", home.path());
    const ScopedEnv depot("QVSDEPLOY_AGENTDEPOT", home.depot());
    fake_sleep::reset();
    const host::Plugin plugin{std::string(ZAV_BUILD_DIR "/lib/libzavmgmt.so")};
    plugin.initialize();
    Lines lines;
    const ras1::Listening listening(lines, host::heardUnits());
    getConfiguration();  // there is no inventory program
    const std::string translator = home.products({"ux"}, "echo out; echo err >&2");
    getConfiguration();
    home.products({"ux"}, "exit 3");
    getConfiguration();
    home.files().write("home/agtqvs6/li6263/bin/zav_xa", "#!/no/such/interpreter\n", 0755);
    getConfiguration();
    home.files().script("home/bin/cinfo", "echo no inventory");
    ask("KINAGT", {});
    const ScopedEnv timeout("TIMEOUT", "1");
    home.products({"ux"}, "exec sleep 600");
    getConfiguration();

    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, std::string(trace::kCommand) + home.path() +
                                                    "/bin/cinfo -d " +
                                                    std::string(trace::kCommandEnd)));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, trace::kNotStarted));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, std::string(trace::kOutput) + "out\n"));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, std::string(trace::kErrors) + "err\n"));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, trace::kTimedOut));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, std::string(trace::kGoodEnd) + "0)"));
    EXPECT_TRUE(lines.heard(trace::kRunnerUnit, std::string(trace::kBadEnd) + "3)"));
    EXPECT_TRUE(lines.heard(trace::kProcessUnit, std::string(trace::kTimeout) + "1 seconds"));
    EXPECT_TRUE(
        lines.heard(trace::kProcessUnit, std::string(trace::kNoProgram) + home.path() + "/bin/"));
    EXPECT_TRUE(lines.heard(trace::kProcessUnit, trace::kWaiting, "waitUntil"));
    EXPECT_TRUE(lines.heard(trace::kProcessUnit, trace::kWaiting, trace::kGivesUp));
    EXPECT_TRUE(lines.heard(trace::kProcessUnit, trace::kGivenUp));
    EXPECT_TRUE(lines.heard(trace::kAnswerUnit, std::string(trace::kAnswer) + "0]"));
    EXPECT_TRUE(lines.heard(trace::kInventoryUnit, trace::kNoInventory));
    if (kVforkSharesMemory) {
        EXPECT_TRUE(lines.entered);
        EXPECT_TRUE(lines.connected);
        EXPECT_TRUE(lines.notExecuted);
    }
}

}  // namespace
