// A host that is killed at each point of a task's way, and what the next one makes of the task.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <ostream>
#include <string>
#include <vector>

#include "crash/killed_host.h"
#include "support/process/left_running.h"

namespace {

enum class Armed { BeforeItIsAsked, ByTheTask };

struct Point {
    const char* name;
    Armed armed;
    int answer;  ///< the status of the answer; 0: the host has died before
    const char* state;
    std::vector<std::string> notes;
};

void PrintTo(const Point& point, std::ostream* out) {
    *out << point.name;
}

const std::vector<std::string> kNothing = {};
const std::vector<std::string> kOnce = {"begin j1", "end j1"};

const Point kPoints[] = {
    {"before-acceptance-is-durable", Armed::BeforeItIsAsked, 0, "unknown", kNothing},
    {"after-acceptance-is-durable", Armed::BeforeItIsAsked, 0, "done", kOnce},
    {"while-command-runs", Armed::ByTheTask, 202, "interrupted", kOnce},
    {"after-command-ended", Armed::ByTheTask, 202, "interrupted", kOnce},
    {"before-outcome-is-durable", Armed::ByTheTask, 202, "interrupted", kOnce},
    {"after-outcome-is-durable", Armed::ByTheTask, 202, "done", kOnce},
};

/// The file that arms the host; it is there before the home is.
std::string armed() {
    return testing::TempDir() + "zav-kill-armed." + std::to_string(::getpid());
}

class KillPoints : public KilledHost, public testing::WithParamInterface<Point> {
protected:
    KillPoints()
        : KilledHost({{"LD_PRELOAD", ZAV_BUILD_DIR "/lib/libzav_kill_points.so"},
                      {"ZAV_KILL_POINT", GetParam().name},
                      {"ZAV_KILL_ARMED", armed()}}) {
        const std::string notes = home.files().path("notes");
        const std::string arm = home.files().path("arm");
        // A task that kills the host must not do so before the answer is sent.
        home.agentScript(untilReleased(home.files().path("go")) + "echo begin $product >>'" +
                         notes + "'\n" + "echo end $product >>'" + notes + "'\n" +  //
                         "[ ! -e '" + arm + "' ] || mv '" + arm + "' '" + armed() + "'\n" +
                         "[ $ZAV_KILL_POINT != while-command-runs ] || ! rm '" + armed() +
                         "' || kill -9 $PPID");
        home.files().write(GetParam().armed == Armed::ByTheTask ? "arm" : "armed", "");
        if (GetParam().armed == Armed::BeforeItIsAsked) {
            EXPECT_EQ(::rename(home.files().path("armed").c_str(), armed().c_str()), 0);
        }
    }
    ~KillPoints() override { ::unlink(armed().c_str()); }

    std::vector<std::string> noted() const {
        std::vector<std::string> lines;
        if (!home.files().exists("notes")) return lines;
        for (const auto& [what, task] : notes())
            lines.push_back(what + " " + task);
        return lines;
    }
};

TEST_P(KillPoints, LeaveATaskThatRanOnceAtMostAndHasOneEnd) {
    const json request = {{"command", "START"}, {"product", "j1"}, {"transid", "j1"}};
    EXPECT_EQ(post("/v1/tasks", request).status, GetParam().answer);
    home.files().write("go", "");
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    host->start();
    ASSERT_TRUE(eventually([this] { return isIdle(); }));
    EXPECT_EQ(get("/v1/tasks/j1").value("state", "unknown"), GetParam().state);
    EXPECT_EQ(noted(), GetParam().notes);
    EXPECT_FALSE(::access(armed().c_str(), F_OK) == 0) << "it died at another point";
}

INSTANTIATE_TEST_SUITE_P(OfATask, KillPoints, testing::ValuesIn(kPoints), [](const auto& point) {
    std::string name = point.param.name;
    for (char& c : name)
        c = c == '-' ? '_' : c;
    return name;
});

}  // namespace
