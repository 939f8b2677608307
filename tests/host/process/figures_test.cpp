#include "host/process/figures.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <chrono>

#include "support/host/program.h"
#include "system/file_descriptor.h"

namespace {

TEST(FiguresOfTheProcess, AreAllKnown) {
    const host::ProcessFigures figures = host::readProcessFigures();
    ASSERT_TRUE(figures.cpuSeconds && figures.startSeconds && figures.virtualBytes &&
                figures.residentBytes && figures.openDescriptors && figures.mostDescriptors &&
                figures.threads && figures.children);
    EXPECT_GT(*figures.residentBytes, 0);
    EXPECT_GE(*figures.virtualBytes, *figures.residentBytes);
    EXPECT_GE(*figures.threads, 1);
}

TEST(FiguresOfTheProcess, CountDescriptors) {
    const host::ProcessFigures before = host::readProcessFigures();
    const sys::FileDescriptor one(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    const sys::FileDescriptor two(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(*host::readProcessFigures().openDescriptors, *before.openDescriptors + 2);
    rlimit limit{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &limit), 0);
    if (limit.rlim_cur != RLIM_INFINITY) {
        EXPECT_EQ(*before.mostDescriptors, static_cast<double>(limit.rlim_cur));
    }
}

TEST(FiguresOfTheProcess, CountChildrenThatLive) {
    const double before = *host::readProcessFigures().children;
    Program sleeper({"/bin/sleep", "1000"});
    EXPECT_EQ(*host::readProcessFigures().children, before + 1);
    sleeper.signal(SIGKILL);
    sleeper.wait();
    EXPECT_EQ(*host::readProcessFigures().children, before);
}

TEST(FiguresOfTheProcess, StartedBeforeNowAndAfterTheMachine) {
    const double now =
        std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
    const double start = *host::readProcessFigures().startSeconds;
    constexpr double kDay = 86'400;
    EXPECT_GT(start, now - kDay);
    EXPECT_LT(start, now + kDay) << "in whole seconds, and clocks may be set";
}

}  // namespace
