#include "metrics/process_figures.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <chrono>

#include "system/file_descriptor.h"

namespace {

TEST(FiguresOfTheProcess, AreAllKnown) {
    const metrics::ProcessFigures figures = metrics::readProcessFigures();
    ASSERT_TRUE(figures.cpuSeconds && figures.startSeconds && figures.virtualBytes &&
                figures.residentBytes && figures.openDescriptors && figures.mostDescriptors &&
                figures.threads);
    EXPECT_GT(*figures.residentBytes, 0);
    EXPECT_GE(*figures.virtualBytes, *figures.residentBytes);
    EXPECT_GE(*figures.threads, 1);
}

TEST(FiguresOfTheProcess, CountDescriptors) {
    const metrics::ProcessFigures before = metrics::readProcessFigures();
    const sys::FileDescriptor one(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    const sys::FileDescriptor two(::open("/dev/null", O_RDONLY | O_CLOEXEC));
    EXPECT_EQ(*metrics::readProcessFigures().openDescriptors, *before.openDescriptors + 2);
    rlimit limit{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &limit), 0);
    if (limit.rlim_cur != RLIM_INFINITY) {
        EXPECT_EQ(*before.mostDescriptors, static_cast<double>(limit.rlim_cur));
    }
}

TEST(FiguresOfTheProcess, StartedBeforeNowAndAfterTheMachine) {
    const double now =
        std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
    const double start = *metrics::readProcessFigures().startSeconds;
    constexpr double kDay = 86'400;
    EXPECT_GT(start, now - kDay);
    EXPECT_LT(start, now + kDay) << "in whole seconds, and clocks may be set";
}

}  // namespace
