// Operations that run out of memory at each of their allocations: an exception at most, and nothing
// left behind.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <new>

#include "base/zavdomp.h"
#include "base/zavrbndl.h"
#include "faults/scenario.h"
#include "mgmt/zavmgmt.h"
#include "platform/oxa.h"
#include "rpc/zavagts.h"
#include "rpc/zavrpc.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "tasks/whole_file.h"
#include "tasks/zavtasks.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

class MemoryShortage : public testing::Test {
protected:
    void SetUp() override {
        if (!kMemoryIsOurs) GTEST_SKIP() << "the sanitizer owns malloc";
        scratch_.makeDir("home/tmp");
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }

    /// Runs `operation` with its first, second, third ... allocation failing until none does; gives
    /// the number of failures and what the last run gave.
    template <typename Operation>
    std::string withEveryFailure(int& failures, const Operation& operation) {
        operation();
        for (failures = 0; failures < 5000; ++failures) {
            const NothingLeft nothing;
            const Fault fault(Call::kNew, failures + 1, ENOMEM);
            std::string result;
            try {
                result = operation();
            } catch (const std::bad_alloc&) {
                result = "no memory";
            }
            if (!fault.happened()) return result;
            results_.insert(result);
        }
        return "never without a failure";
    }

    ScratchDir scratch_;
    std::set<std::string> results_;  ///< of the runs with a failure
    int failures_ = 0;
    ScopedEnv homeVariable_{"TOVRINHOME", scratch_.makeDir("home")};
    ScopedEnv depotVariable_{"QVSDEPLOY_AGENTDEPOT", scratch_.makeDir("depot")};
};

void put32(std::string& bytes, std::uint32_t value) {
    bytes.append(reinterpret_cast<const char*>(&value), 4);
}

/// A request to write `text` to install.sh, as this machine would send it.
std::string transferRequest(const std::string& text) {
    std::string bytes;
    put32(bytes, 0);
    const std::string name("install.sh", 11);
    put32(bytes, 11);
    put32(bytes, 0);
    put32(bytes, 11);
    bytes += name;
    bytes.append(1, '\0');  // aligns
    put32(bytes, 0);
    put32(bytes, 1);
    put32(bytes, 0);
    const std::uint16_t count = 1;
    bytes.append(reinterpret_cast<const char*>(&count), 2);
    bytes.append(2, '\0');  // aligns
    put32(bytes, static_cast<std::uint32_t>(text.size()));
    bytes += text;
    bytes.append(4096 - text.size(), '\0');
    return bytes;
}

TEST_F(MemoryShortage, ATransferIsAFaultOrWhole) {
    const std::string bytes = transferRequest("a\r\nb\r\n");
    const QVS_Agent_v1_mgr_epv manager{&BinaryDataTransfer};
    const auto transfer = [&] {
        unsigned char room[16] = {};
        rpc__reply reply{room, sizeof room, 0};
        const rpc__request request{nullptr, reinterpret_cast<const unsigned char*>(bytes.data()),
                                   bytes.size(), true};
        const std::uint32_t fault =
            QVS_Agent_v1_BinaryDataTransfer_stub(&request, &manager, &reply);
        return std::to_string(fault) + " " + std::to_string(reply.length) + " " +
               std::to_string(room[0]);
    };
    EXPECT_EQ(withEveryFailure(failures_, transfer), "0 4 0");
    EXPECT_GT(failures_, 5);
    EXPECT_EQ(scratch_.read("depot/install.sh"), "a\nb\n");
    // A file that could not be converted is one that arrived.
    const std::string fault = std::to_string(rpc__s_fault_unspec) + " 0 0";
    for (const std::string& result : results_)
        EXPECT_TRUE(result == fault || result == "0 4 0") << result;
    EXPECT_EQ(results_.count(fault), 1u);
}

TEST_F(MemoryShortage, WholeFilesThrowAtMost) {
    const std::string path = scratch_.path("text");
    const auto writeAndRead = [&] {
        const int written = writeFile(path.c_str(), "some text that is long enough");
        return std::to_string(written) + narrow(readFile(path.c_str()));
    };
    EXPECT_EQ(withEveryFailure(failures_, writeAndRead), "1some text that is long enough");
    EXPECT_EQ(results_, (std::set<std::string>{"no memory"}));
}

TEST_F(MemoryShortage, PropertiesThrowAtMost) {
    const std::string path = scratch_.write("properties", "key = value\nother = one\n");
    const auto look = [&] {
        const ZAV::ResourceBundle bundle(path.c_str(), '*');
        return narrow(*bundle.getValue("key"));
    };
    EXPECT_EQ(withEveryFailure(failures_, look), "value");
    EXPECT_EQ(results_, (std::set<std::string>{"no memory"}));
}

TEST_F(MemoryShortage, DocumentsThrowAtMost) {
    const auto parse = [] {
        ZAV::DOMParser parser("<a one='1'><b>text</b></a>");
        String out;
        if (parser.parse() == 1) parser.getDocument()->dump(out);
        return narrow(out);
    };
    const std::string whole = parse();
    EXPECT_NE(whole, "");
    EXPECT_EQ(withEveryFailure(failures_, parse), whole);
    // Without an event parser there is no document.
    EXPECT_EQ(results_, (std::set<std::string>{"", "no memory"}));
}

TEST_F(MemoryShortage, ACommandThrowsAtMost) {
    const auto command = [] {
        int rc = -99;
        String out;
        String err;
        const bool ran = Util::runCommand("/bin/cat", rc, out, err, "input", false);
        return std::string(ran ? "true " : "false ") + narrow(out);
    };
    EXPECT_EQ(withEveryFailure(failures_, command), "true input");
    EXPECT_GT(failures_, 10);
    EXPECT_EQ(results_, (std::set<std::string>{"no memory"}));
}

TEST_F(MemoryShortage, PruningThrowsAtMost) {
    const auto prune = [&] {
        scratch_.write("logs/a_long_enough_prefix_1", "");
        scratch_.write("logs/a_long_enough_prefix_2", "");
        ZAV::pruneLogs(scratch_.path("logs").c_str(), "a_long_enough_prefix_", 2);
        const bool both = scratch_.exists("logs/a_long_enough_prefix_1") &&
                          scratch_.exists("logs/a_long_enough_prefix_2");
        return std::string(both ? "both" : "one");
    };
    EXPECT_EQ(withEveryFailure(failures_, prune), "one");
    EXPECT_EQ(results_.count("no memory"), 1u);
}

// The last one, because it leaves a thread behind.
TEST_F(MemoryShortage, AStartUpThatFailsSaysSoAndCanBeRepeated) {
    TraceCapture traces("ERROR");
    {
        const Fault fault(Call::kNew, 1, ENOMEM, Fault::Lasts::kOnwards);
        EXPECT_EQ(Initialize_Mgmt_Functions(), OXA_FAILED);
    }
    EXPECT_FALSE(initialized);
    // There was no memory for the reason.
    EXPECT_EQ(traces.count('E', "Exception caught: %s"), 1);
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_TRUE(initialized);
}

}  // namespace
