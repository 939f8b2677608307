// Who can still write into a pipe.
#include "host/process/children/pipe_writers.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>

#include "system/file_descriptor.h"

namespace {

struct Pipe {
    Pipe() {
        std::array<int, 2> ends{};
        if (::pipe2(ends.data(), O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
        readEnd = sys::FileDescriptor(ends[0]);
        writeEnd = sys::FileDescriptor(ends[1]);
    }
    ino_t number() const {
        struct stat file {};
        return ::fstat(readEnd.get(), &file) == 0 ? file.st_ino : 0;
    }
    sys::FileDescriptor readEnd;
    sys::FileDescriptor writeEnd;
};

using Numbers = std::set<ino_t>;

TEST(PipeWriters, AreFoundAndKilledWhateverTheirSession) {
    Pipe pipe;
    const pid_t child = ::fork();
    if (child == 0) {
        ::setsid();
        for (;;)
            ::pause();
    }
    pipe.writeEnd = {};
    const Numbers pipes{pipe.number()};
    EXPECT_EQ(host::pipesToWrite(child).count(pipe.number()), 1U);
    EXPECT_TRUE(host::haveWriters(pipes));
    EXPECT_EQ(host::killWritersTo(pipes), 1U);
    int status = 0;
    EXPECT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_FALSE(host::haveWriters(pipes));
}

TEST(PipeWriters, ThisProcessIsSpared) {
    const Pipe pipe;
    const Numbers pipes{pipe.number()};
    EXPECT_TRUE(host::haveWriters(pipes));
    EXPECT_EQ(host::killWritersTo(pipes), 0U);
}

TEST(PipeWriters, WhoOnlyReadsIsSpared) {
    Pipe pipe;
    pipe.writeEnd = {};
    const Numbers pipes{pipe.number()};
    EXPECT_FALSE(host::haveWriters(pipes));
    EXPECT_EQ(host::killWritersTo(pipes), 0U);
    EXPECT_EQ(host::killWritersTo({}), 0U);
}

}  // namespace
