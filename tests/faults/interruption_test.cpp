// Signals that interrupt whatever a thread is doing: all results are those without them.
#include <gtest/gtest.h>
#include <pthread.h>
#include <signal.h>
#include <sys/time.h>

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <functional>

#include "base/zavrbndl.h"
#include "faults/scenario.h"
#include "rpc/zavrpc.h"
#include "support/clock.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "tasks/whole_file.h"
#include "util/zavutil.h"

using namespace faults;
using ZAV::String;
using ZAV::Util;

namespace {

std::atomic<long> signalsTaken{0};

extern "C" void countSignal(int) {
    ++signalsTaken;
}

/// A signal every half millisecond, whose handler does not let calls go on by themselves.
class SignalStorm {
public:
    SignalStorm() {
        signalsTaken = 0;
        struct sigaction action {};
        action.sa_handler = &countSignal;
        ::sigaction(SIGALRM, &action, &before_);
        constexpr itimerval kOften{{0, 500}, {0, 500}};
        ::setitimer(ITIMER_REAL, &kOften, nullptr);
    }
    ~SignalStorm() {
        constexpr itimerval kNever{};
        ::setitimer(ITIMER_REAL, &kNever, nullptr);
        ::sigaction(SIGALRM, &before_, nullptr);
    }
    SignalStorm(const SignalStorm&) = delete;
    SignalStorm& operator=(const SignalStorm&) = delete;

private:
    struct sigaction before_ {};
};

class Interruption : public testing::Test {
protected:
    Interruption() {
        scratch_.makeDir("home/tmp");
        Util::_homeDir.clear();
        Util::_agentDepotDir.clear();
    }

    static std::string run(const std::string& command, const std::string& input = "") {
        int rc = -99;
        String out;
        String err;
        const bool ran = Util::runCommand(command.c_str(), rc, out, err, input.c_str(), false);
        return std::string(ran ? "true " : "false ") + std::to_string(rc) + narrow(out) + "|" +
               narrow(err);
    }
    std::string transfer(const std::string& name) const {
        std::vector<ZAV::DataChunk> chunks(100);
        for (ZAV::DataChunk& chunk : chunks) {
            chunk.length = 4096;
            for (std::size_t i = 0; i < 4096; ++i)
                chunk.data[i] = i % 2 == 0 ? '\r' : 'x';
        }
        std::int32_t status = -1;
        BinaryDataTransfer(nullptr, 0, name.c_str(), 0, 1, 99, chunks.data(), &status);
        return std::to_string(status) + scratch_.read("depot/" + name);
    }
    std::string copied() const {
        const int rc = Util::_copyFile(long_.c_str(), scratch_.path("copy").c_str());
        return std::to_string(rc) + scratch_.read("copy");
    }
    std::string readWhole() const {
        char* text = nullptr;
        const int rc = Util::readFile(long_.c_str(), &text);
        const std::string found = std::to_string(rc) + (text != nullptr ? text : "");
        std::free(text);
        return found;
    }
    std::string property() const {
        const ZAV::ResourceBundle bundle(scratch_.path("properties").c_str(), '*');
        return narrow(*bundle.getValue("key"));
    }
    std::string wholeText() const {
        const int written = writeFile(scratch_.path("text").c_str(), content_.c_str());
        return std::to_string(written) + narrow(readFile(scratch_.path("text").c_str()));
    }
    std::string directories() const {
        std::filesystem::remove_all(scratch_.path("a"));
        return std::to_string(Util::createDir(scratch_.path("a/b/c").c_str()));
    }

    struct Operation {
        const char* name;
        std::function<std::string()> run;
    };
    std::vector<Operation> operations() {
        return {
            {"command", [] { return run("/bin/sh -c \"echo out; echo err >&2; exit 3\""); }},
            {"input", [this] { return run("/bin/cat", content_); }},
            {"pause", [] { return run("/bin/sh -c \"echo a; sleep 0.05; echo b\""); }},
            {"transfer", [this] { return transfer("file"); }},
            {"conversion", [this] { return transfer("model.mdl"); }},
            {"copy", [this] { return copied(); }},
            {"read", [this] { return readWhole(); }},
            {"property", [this] { return property(); }},
            {"text", [this] { return wholeText(); }},
            {"directories", [this] { return directories(); }},
        };
    }

    TraceCapture traces_{"ERROR"};  // keeps them off the terminal
    ScratchDir scratch_;
    std::string content_ = std::string(200 * 1000, 'x');
    std::string long_ = scratch_.write("long", content_);
    std::string properties_ = scratch_.write("properties", "key = value\n");
    ScopedEnv homeVariable_{"TOVRINHOME", scratch_.makeDir("home")};
    ScopedEnv depotVariable_{"QVSDEPLOY_AGENTDEPOT", scratch_.makeDir("depot")};
};

TEST_F(Interruption, EveryOtherCallChangesNothing) {
    for (const Operation& operation : operations()) {
        const std::string expected = operation.run();
        const NothingLeft nothing;
        int interrupted = 0;
        std::string result;
        {
            const Interruptions interruptions;
            result = operation.run();
            interrupted = interruptions.count();
        }
        EXPECT_TRUE(expected == result) << operation.name << ": " << result.substr(0, 200);
        if (std::strcmp(operation.name, "directories") != 0) {
            EXPECT_GT(interrupted, 0) << operation.name;
        }
    }
}

TEST_F(Interruption, AStormOfSignalsChangesNothing) {
    for (const Operation& operation : operations()) {
        const std::string expected = operation.run();
        const NothingLeft nothing;
        const SignalStorm storm;
        const Stopwatch watch;
        do {
            const std::string result = operation.run();
            ASSERT_TRUE(expected == result) << operation.name << ": " << result.substr(0, 200);
        } while (watch.seconds() < 0.1);
        EXPECT_GT(signalsTaken, 0) << operation.name;
    }
}

TEST_F(Interruption, AStormNeitherShortensNorProlongsTheTimeout) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const NothingLeft nothing;
    const SignalStorm storm;
    const Stopwatch watch;
    EXPECT_EQ(run("/bin/sleep 60"), "false 0|");
    EXPECT_GE(watch.seconds(), 0.99);
}

}  // namespace
