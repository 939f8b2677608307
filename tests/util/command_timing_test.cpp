// How long commands and the waiting for them take.
// ctest-label: timing

#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>

#include "support/clock.h"
#include "support/process/growth.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

using namespace ZAV;

namespace {

bool runs(const std::string& command, String& out) {
    int rc = -1;
    String err;
    return Util::runCommand(String(command.c_str()), rc, out, err, String(), false);
}

double secondsToRun(const std::string& command) {
    const Stopwatch watch;
    String out;
    runs(command, out);
    return watch.seconds();
}

TEST(CommandTiming, AnEndIsNoticedAtOnce) {
    const double withoutUs = shortestOf(5, [] {
        char sleep[] = "/bin/sleep", time[] = "0.2";
        char* const arguments[] = {sleep, time, nullptr};
        pid_t child = -1;
        ASSERT_EQ(::posix_spawn(&child, sleep, nullptr, nullptr, arguments, environ), 0);
        EXPECT_EQ(::waitpid(child, nullptr, 0), child);
    });
    const double withUs = shortestOf(5, [] {
        Process process(String("/bin/sleep 0.2"));
        ASSERT_TRUE(process.start());
        EXPECT_TRUE(process.wait(nullptr));
    });
    // A look once a second would make it five times as long.
    EXPECT_LT(withUs, 2 * withoutUs);
}

TEST(CommandTiming, AChildThatClosesItsOutputHasNoMoreTimeThanAnyOther) {
    const TraceCapture quiet("ERROR");
    const ScopedEnv timeout("TIMEOUT", "3");
    const double silent = secondsToRun("/bin/sleep 60");
    const double closing = secondsToRun("/bin/sh -c 'sleep 2; exec >&- 2>&-; exec sleep 60'");
    // It would be 5/3 if the time began again when the output ends.
    EXPECT_LT(closing, 1.33 * silent);
}

TEST(CommandTiming, ReadingTheOutputGrowsInProportionToIt) {
    const ScratchDir scratch;
    const double growth = growthOverEightfold(4u << 20, [&scratch](unsigned bytes) {
        const std::string file = scratch.write("data", std::string(bytes, 'x'));
        String out;
        EXPECT_TRUE(runs("/bin/cat " + file, out));
        EXPECT_EQ(out.length(), bytes);
    });
    EXPECT_LT(growth, kProportionate);
}

}  // namespace
