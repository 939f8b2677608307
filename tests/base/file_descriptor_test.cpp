// ctest-label: threaded
// File descriptors that close themselves, and reading and writing through them.
#include "base/file_descriptor.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <string>
#include <thread>
#include <utility>

#include "support/scratch_dir.h"

using namespace ZAV;

namespace {

bool isOpen(int fd) {
    return ::fcntl(fd, F_GETFD) != -1;
}

TEST(FileDescriptor, ClosesWhatItOwnsOnce) {
    const ScratchDir scratch;
    FileDescriptor file = openFile(scratch.write("f", "x").c_str(), O_RDONLY);
    ASSERT_TRUE(file.isOpen());
    const int fd = file.get();
    EXPECT_TRUE(isOpen(fd));
    EXPECT_EQ(file.close(), 0);
    EXPECT_FALSE(isOpen(fd));
    EXPECT_FALSE(file.isOpen());
    EXPECT_EQ(file.close(), 0);
}

TEST(FileDescriptor, DestructionClosesAndKeepsErrno) {
    const ScratchDir scratch;
    int fd = -1;
    {
        const FileDescriptor file = openFile(scratch.write("f", "x").c_str(), O_RDONLY);
        fd = file.get();
        const FileDescriptor stale(1000000);
        errno = EXDEV;
    }
    EXPECT_EQ(errno, EXDEV);
    EXPECT_FALSE(isOpen(fd));
}

TEST(FileDescriptor, CloseOfADescriptorThatIsGoneSaysSo) {
    EXPECT_EQ(FileDescriptor(1000000).close(), EBADF);
}

TEST(FileDescriptor, MovingHandsOver) {
    const ScratchDir scratch;
    const std::string path = scratch.write("f", "x");
    FileDescriptor first = openFile(path.c_str(), O_RDONLY);
    const int fd = first.get();
    FileDescriptor second(std::move(first));
    EXPECT_EQ(second.get(), fd);
    FileDescriptor third = openFile(path.c_str(), O_RDONLY);
    const int replaced = third.get();
    third = std::move(second);
    EXPECT_EQ(third.get(), fd);
    EXPECT_FALSE(isOpen(replaced));
    const int released = third.release();
    EXPECT_EQ(released, fd);
    EXPECT_TRUE(isOpen(fd));
    ::close(released);
}

TEST(OpenFile, IsCloseOnExec) {
    const ScratchDir scratch;
    const FileDescriptor file = openFile(scratch.write("f", "x").c_str(), O_RDONLY);
    EXPECT_EQ(::fcntl(file.get(), F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
}

TEST(OpenFile, FailureLeavesTheReasonInErrno) {
    const ScratchDir scratch;
    EXPECT_FALSE(openFile(scratch.path("none").c_str(), O_RDONLY).isOpen());
    EXPECT_EQ(errno, ENOENT);
}

TEST(OpenFile, CreatesWithTheModeGiven) {
    const ScratchDir scratch;
    const mode_t former = ::umask(022);
    const FileDescriptor file =
        openFile(scratch.path("f").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0660);
    ::umask(former);
    struct stat info;
    ASSERT_EQ(::fstat(file.get(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777u, 0640u);
}

TEST(OpenFile, NeverWaitsForAPipeAndOpensNoDevice) {
    const ScratchDir scratch;
    const std::string pipe = scratch.path("pipe");
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    EXPECT_FALSE(openFile(pipe.c_str(), O_RDONLY).isOpen());
    EXPECT_EQ(errno, ESPIPE);
    EXPECT_FALSE(openFile(pipe.c_str(), O_RDWR | O_APPEND).isOpen());
    EXPECT_EQ(errno, ESPIPE);
    EXPECT_FALSE(openFile(pipe.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600).isOpen());
    EXPECT_EQ(errno, ENXIO);
    for (const char* device : {"/dev/zero", "/dev/null", "/dev/full"}) {
        EXPECT_FALSE(openFile(device, O_RDWR).isOpen()) << device;
        EXPECT_EQ(errno, ESPIPE) << device;
    }
}

TEST(OpenFile, LeavesTheStandardDescriptorsAlone) {
    const ScratchDir scratch;
    const std::string path = scratch.write("f", "x");
    const int saved = ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
    ::close(STDIN_FILENO);
    const FileDescriptor file = openFile(path.c_str(), O_RDONLY);
    const bool stayedFree = !isOpen(STDIN_FILENO);
    const int flags = ::fcntl(file.get(), F_GETFD);
    if (saved >= 0) {
        ::dup2(saved, STDIN_FILENO);
        ::close(saved);
    }
    EXPECT_TRUE(stayedFree);
    EXPECT_GT(file.get(), STDERR_FILENO);
    EXPECT_EQ(flags & FD_CLOEXEC, FD_CLOEXEC);
}

TEST(OpenStream, ReadsOrStartsTheFileAnew) {
    const ScratchDir scratch;
    const std::string path = scratch.write("f", "old text");
    std::FILE* stream = openStream(path.c_str(), "wb");
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(std::fputs("new", stream), 1);
    EXPECT_EQ(::fcntl(::fileno(stream), F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
    EXPECT_EQ(std::fclose(stream), 0);
    stream = openStream(path.c_str(), "rb");
    ASSERT_NE(stream, nullptr);
    char read[16] = "";
    EXPECT_EQ(std::fread(read, 1, sizeof read, stream), 3u);
    EXPECT_STREQ(read, "new");
    EXPECT_EQ(std::fclose(stream), 0);
}

TEST(OpenStream, FailureLeavesTheReasonInErrno) {
    const ScratchDir scratch;
    EXPECT_EQ(openStream(scratch.path("none").c_str(), "rb"), nullptr);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(openStream(scratch.path().c_str(), "wb"), nullptr);
    EXPECT_EQ(errno, EISDIR);
}

TEST(OpenStream, LeavesTheStandardDescriptorsAlone) {
    const ScratchDir scratch;
    const int saved = ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
    ::close(STDIN_FILENO);
    std::FILE* const stream = openStream(scratch.path("f").c_str(), "wb");
    const bool stayedFree = !isOpen(STDIN_FILENO);
    if (saved >= 0) {
        ::dup2(saved, STDIN_FILENO);
        ::close(saved);
    }
    EXPECT_TRUE(stayedFree);
    ASSERT_NE(stream, nullptr);
    EXPECT_GT(::fileno(stream), STDERR_FILENO);
    std::fclose(stream);
}

/// Interrupts system calls of the thread that it is sent to.
class InterruptingSignal {
public:
    InterruptingSignal() {
        struct sigaction action {};
        action.sa_handler = [](int) {};
        ::sigaction(SIGUSR1, &action, &former_);
    }
    ~InterruptingSignal() { ::sigaction(SIGUSR1, &former_, nullptr); }

private:
    struct sigaction former_ {};
};

TEST(ReadAndWrite, GoOnAfterSignals) {
    const InterruptingSignal interrupting;
    int ends[2];
    ASSERT_EQ(::pipe2(ends, O_CLOEXEC), 0);
    FileDescriptor readEnd(ends[0]);
    FileDescriptor writeEnd(ends[1]);
    const std::string sent(1 << 20, 'x');  // more than a pipe holds
    const pthread_t writer = ::pthread_self();
    std::string received;
    std::thread reader([&] {
        char chunk[4096];
        for (ssize_t got; (got = readSome(readEnd.get(), chunk, sizeof chunk)) > 0;) {
            ::pthread_kill(writer, SIGUSR1);
            received.append(chunk, static_cast<std::size_t>(got));
        }
    });
    EXPECT_EQ(writeAll(writeEnd.get(), sent.data(), sent.size()), 0);
    ::pthread_kill(reader.native_handle(), SIGUSR1);
    writeEnd.close();
    reader.join();
    EXPECT_EQ(received, sent);
}

TEST(ReadAndWrite, ReportFailures) {
    const ScratchDir scratch;
    const FileDescriptor file = openFile(scratch.write("f", "x").c_str(), O_RDONLY);
    EXPECT_EQ(writeAll(file.get(), "x", 1), EBADF);
    EXPECT_EQ(writeAll(file.get(), "x", 0), 0);
    char byte;
    const FileDescriptor directory = openFile(scratch.path().c_str(), O_RDONLY);
    EXPECT_EQ(readSome(directory.get(), &byte, 1), -1);
    EXPECT_EQ(errno, EISDIR);
}

}  // namespace
