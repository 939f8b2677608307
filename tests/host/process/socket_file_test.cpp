#include "host/process/socket_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <optional>
#include <thread>
#include <utility>

#include "host/process/start_error.h"
#include "host/raw_client.h"
#include "support/scratch_dir.h"

namespace {

using host::SocketFile;

constexpr uid_t kNobody = 65534;

std::string errorOf(const std::string& path) {
    try {
        const SocketFile socket(path);
    } catch (const host::StartError& error) {
        return error.what();
    }
    return "";
}

class Socket : public testing::Test {
protected:
    mode_t modeOf(const std::string& file) {
        struct stat found {};
        return ::lstat(file.c_str(), &found) == 0 ? found.st_mode : 0;
    }

    ScratchDir scratch;
    const std::string path = scratch.path("host.sock");
};

TEST_F(Socket, IsPrivateWhateverTheMask) {
    for (const mode_t mask : {0000U, 0022U, 0777U}) {
        const mode_t before = ::umask(mask);
        const SocketFile socket(path);
        ::umask(before);
        EXPECT_EQ(modeOf(path), S_IFSOCK | 0600U) << mask;
    }
}

TEST_F(Socket, ForEverybodyIsSoWhateverTheMask) {
    for (const mode_t mask : {0000U, 0022U, 0777U}) {
        const mode_t before = ::umask(mask);
        const SocketFile socket(path, host::Connects::Everybody);
        ::umask(before);
        EXPECT_EQ(modeOf(path), S_IFSOCK | 0666U) << mask;
    }
}

TEST_F(Socket, ForEverybodyNeedsADirectoryThatOnlyItsOwnerMayWrite) {
    for (const mode_t mode : {01777U, 0775U, 0757U}) {
        ASSERT_EQ(::chmod(scratch.path().c_str(), mode), 0);
        EXPECT_THROW(SocketFile(path, host::Connects::Everybody), host::StartError) << mode;
        EXPECT_EQ(modeOf(path), 0U) << "nothing was made";
    }
    ASSERT_EQ(::chmod(scratch.path().c_str(), 01777), 0);
    EXPECT_NO_THROW(SocketFile(path, host::Connects::Owner)) << "the sticky bit is enough there";
    ASSERT_EQ(::chmod(scratch.path().c_str(), 0755), 0);
    EXPECT_NO_THROW(SocketFile(path, host::Connects::Everybody));
}

TEST_F(Socket, IsConnectedToOnlyWhenItListens) {
    SocketFile socket(path);
    EXPECT_FALSE(RawClient(path).connected());
    const int descriptor = socket.listen();
    EXPECT_TRUE(RawClient(path).connected());
    EXPECT_NE(::fcntl(descriptor, F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_NE(::fcntl(descriptor, F_GETFL) & O_NONBLOCK, 0);
}

TEST_F(Socket, IsRemovedAtTheEndWithItsLock) {
    {
        SocketFile socket(path);
        socket.listen();
    }
    EXPECT_FALSE(scratch.exists("host.sock"));
    EXPECT_FALSE(scratch.exists("host.sock.lock"));
    EXPECT_EQ(errorOf(path), "") << "the path is free again";
}

TEST_F(Socket, ThatIsServedIsLeftAlone) {
    SocketFile socket(path);
    EXPECT_EQ(errorOf(path), "socket " + path + " is in use by a live host") << "not yet listening";
    socket.listen();
    EXPECT_EQ(errorOf(path), "socket " + path + " is in use by a live host");
    EXPECT_TRUE(RawClient(path).connected());
    EXPECT_TRUE(scratch.exists("host.sock.lock"));
}

TEST_F(Socket, ThatAProgramWithoutLockServesIsLeftAloneToo) {
    const sys::FileDescriptor other(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, path.size());
    ASSERT_EQ(::bind(other.get(), reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    ASSERT_EQ(::listen(other.get(), 1), 0);
    EXPECT_EQ(errorOf(path), "socket " + path + " is in use by a live host");
    EXPECT_TRUE(RawClient(path).connected());
    EXPECT_FALSE(scratch.exists("host.sock.lock"));
}

TEST_F(Socket, OfAHostThatWasKilledIsReplaced) {
    const pid_t child = ::fork();
    if (child == 0) {
        SocketFile socket(path);
        socket.listen();
        ::_exit(0);  // leaves its files behind as a killed process does
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(scratch.exists("host.sock"));
    ASSERT_TRUE(scratch.exists("host.sock.lock"));
    SocketFile socket(path);
    socket.listen();
    EXPECT_TRUE(RawClient(path).connected());
}

TEST_F(Socket, IsAwaitedWhileAChildOfAKilledHostStillHasItsLock) {
    sys::FileDescriptor lock(::open((path + ".lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    ASSERT_EQ(::flock(lock.get(), LOCK_EX), 0);
    std::thread child([&lock] {
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        lock = {};
    });
    EXPECT_EQ(errorOf(path), "");
    child.join();
}

TEST_F(Socket, NeverReplacesAnotherKindOfFile) {
    scratch.write("host.sock", "precious");
    EXPECT_EQ(errorOf(path), path + " exists and is not a socket");
    EXPECT_EQ(scratch.read("host.sock"), "precious");
    EXPECT_FALSE(scratch.exists("host.sock.lock"));
    const std::string directory = scratch.makeDir("dir");
    EXPECT_EQ(errorOf(directory), directory + " exists and is not a socket");
    const std::string link = scratch.path("link");
    ASSERT_EQ(::symlink("nowhere", link.c_str()), 0);
    EXPECT_EQ(errorOf(link), link + " exists and is not a socket");
    EXPECT_TRUE(S_ISLNK(modeOf(link)));
}

TEST_F(Socket, WhoseFileWasTakenByAnotherRemovesOnlyItsOwn) {
    std::optional<SocketFile> socket(path);
    ASSERT_EQ(::unlink(path.c_str()), 0);
    scratch.write("host.sock", "another's");
    socket.reset();
    EXPECT_EQ(scratch.read("host.sock"), "another's");
}

TEST_F(Socket, NameMayBeAsLongAsAnAddressHolds) {
    const std::size_t limit = sizeof sockaddr_un{}.sun_path - 1;
    const std::string longest = scratch.path(std::string(limit - scratch.path().size() - 1, 's'));
    ASSERT_EQ(longest.size(), limit);
    EXPECT_EQ(errorOf(longest), "");
    EXPECT_EQ(errorOf(longest + "s"), "socket name " + longest + "s is longer than 107 bytes");
    EXPECT_FALSE(scratch.exists(longest.substr(scratch.path().size() + 1) + "s.lock"));
}

TEST_F(Socket, WhereOthersMayReplaceItIsRefused) {
    const std::string folder = scratch.makeDir("open");
    const std::string inside = folder + "/host.sock";
    for (const mode_t mode : {0777U, 0775U, 0770U, 0720U}) {
        ASSERT_EQ(::chmod(folder.c_str(), mode), 0);
        EXPECT_EQ(errorOf(inside), "socket " + inside + ": others may write to its directory " +
                                       folder + " and could replace it")
            << std::oct << mode;
        EXPECT_FALSE(scratch.exists("open/host.sock.lock"));
    }
    for (const mode_t mode : {01777U, 01770U, 0755U, 0700U}) {
        ASSERT_EQ(::chmod(folder.c_str(), mode), 0);
        EXPECT_EQ(errorOf(inside), "") << std::oct << mode;
    }
}

TEST_F(Socket, InTheDirectoryOfSomebodyElseIsRefused) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can give a directory away";
    const std::string folder = scratch.makeDir("others");
    const std::string inside = folder + "/host.sock";
    for (const mode_t mode : {0700U, 01777U}) {
        ASSERT_EQ(::chown(folder.c_str(), kNobody, kNobody), 0);
        ASSERT_EQ(::chmod(folder.c_str(), mode), 0);
        EXPECT_EQ(errorOf(inside), "socket " + inside + ": its directory " + folder +
                                       " belongs to another user, 65534, who could replace it");
    }
    EXPECT_FALSE(scratch.exists("others/host.sock.lock"));
}

TEST_F(Socket, MayBeInTheWorkingDirectory) {
    const std::filesystem::path before = std::filesystem::current_path();
    std::filesystem::current_path(scratch.path());
    EXPECT_EQ(errorOf("host.sock"), "");
    ASSERT_EQ(::chmod(scratch.path().c_str(), 0777), 0);
    EXPECT_EQ(errorOf("host.sock"),
              "socket host.sock: others may write to its directory . and could replace it");
    std::filesystem::current_path(before);
}

TEST_F(Socket, InADirectoryThatIsNotThereIsAnError) {
    const std::string lost = scratch.path("no/host.sock");
    EXPECT_EQ(errorOf(lost), "cannot make " + lost + ".lock: No such file or directory");
}

TEST_F(Socket, OneThatSomebodyElseBoundStaysWhenItIsGivenUp) {
    SocketFile theirs(path);
    sys::FileDescriptor passed(::fcntl(theirs.listen(), F_DUPFD_CLOEXEC, 0));
    ASSERT_EQ(::unlink((path + ".lock").c_str()), 0) << "the one who passes it holds no lock";
    {
        SocketFile socket(path, host::Connects::Owner, std::move(passed));
        EXPECT_EQ(socket.path(), path);
        EXPECT_NE(errorOf(path).find("is in use by a live host"), std::string::npos);
        EXPECT_GE(socket.listen(), 0);
        socket.remove();
    }
    EXPECT_TRUE(S_ISSOCK(modeOf(path)));
    EXPECT_FALSE(scratch.exists("host.sock.lock"));
    EXPECT_TRUE(RawClient(path).connected()) << "it still listens";
}

}  // namespace
