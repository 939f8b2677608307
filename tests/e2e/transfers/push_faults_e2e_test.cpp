// Pushes that break off, that run beside each other, and what they leave in the host.
// ctest-label: threaded

#include <gmock/gmock.h>

#include <csignal>
#include <fstream>

#include "e2e/transfers/push_fixture.h"

namespace {

// Instrumented programs keep freed memory for a while and are slow.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr std::size_t kLargeFile = std::size_t{16} << 20;
constexpr bool kMeasuresMemory = false;
#else
constexpr std::size_t kLargeFile = std::size_t{256} << 20;
constexpr bool kMeasuresMemory = true;
#endif

class PushFaults : public PushFixture {
protected:
    /// Starts zavctl in the background.
    std::unique_ptr<Program> startPush(const std::string& source) const {
        return std::make_unique<Program>(
            std::vector<std::string>{zavctlPath(), "--socket", host_->socket(), "push", source});
    }
    std::size_t arrived(const std::string& name) const {
        std::error_code missing;
        const auto size = std::filesystem::file_size(files_.path("depot/" + name), missing);
        return missing ? 0 : static_cast<std::size_t>(size);
    }
    /// The content, and behind it a hole too large for a push to end before it is interrupted.
    void endlessFile(const std::string& content) const {
        std::filesystem::resize_file(files_.write("large", content), std::uintmax_t{8} << 30);
    }
    /// Begins a push of the endless file and comes back when some of it has arrived.
    std::unique_ptr<Program> startEndless() const {
        auto program = startPush(files_.path("large"));
        EXPECT_TRUE(eventually([&] { return arrived("large") > 0; }));
        return program;
    }
    /// Pushes what stands before the hole.
    void repeat(const std::string& content) const {
        const std::string file = files_.path("large");
        std::filesystem::resize_file(file, content.size());
        EXPECT_EQ(push(file).status, 0);
        EXPECT_TRUE(depot("large") == content);
    }
    /// The most memory that the host has ever had, in KiB.
    long peakKiB() const {
        std::ifstream in("/proc/" + std::to_string(host_->pid()) + "/status");
        for (std::string line; std::getline(in, line);) {
            if (line.rfind("VmHWM:", 0) == 0) return std::atol(line.c_str() + 6);
        }
        return -1;
    }
};

TEST_F(PushFaults, NobodyListensIsStatusThree) {
    start();
    const std::string file = files_.write("file", "x");
    const ProgramResult result =
        runProgram({zavctlPath(), "--rpc-socket", files_.path("nobody.rpc"), "push", file});
    EXPECT_EQ(result.status, 3);
    EXPECT_EQ(result.err, "zavctl: no host reached at " + files_.path("nobody.rpc") +
                              ": No such file or directory\n  start one with: zavhost --home DIR "
                              "--socket " +
                              files_.path("nobody") + "\n");
}

TEST_F(PushFaults, WithoutAHostToAskABinaryIsNotSentUnderANameThatCostsItBytes) {
    start();
    const std::string file = files_.write("tool", std::string("a\r\0\x1a", 4));
    const ProgramResult result =
        runProgram({zavctlPath(), "--socket", files_.path("nobody"), "--rpc-socket",
                    host_->socket() + ".rpc", "push", file, "install.sh.tar"});
    EXPECT_EQ(result.status, 1) << result.out;
    EXPECT_THAT(result.out + result.err, testing::HasSubstr("it is no text"));
    EXPECT_FALSE(files_.exists("depot/install.sh.tar"));
}

TEST_F(PushFaults, AHostThatDoesNotAnswerIsStatusFour) {
    start();
    const std::string file = files_.write("file", "x");
    ::kill(host_->pid(), SIGSTOP);
    for (const char* timeout : {"0.3", "0"}) {
        const ProgramResult result = host_->zavctl({"--timeout", timeout, "push", file});
        EXPECT_EQ(result.status, 4);
        EXPECT_EQ(result.err,
                  "zavctl: the host did not answer within the time-out; nothing was sent\n")
            << "it is not asked again by the transfer";
    }
    ::kill(host_->pid(), SIGCONT);
    EXPECT_EQ(push(file).status, 0);
}

TEST_F(PushFaults, AHostThatGoesAwayIsStatusThreeAndThePushCanBeRepeated) {
    const std::string content = randomBytes(5 * kBatch);
    endlessFile(content);
    start();
    const auto program = startEndless();
    host_->program().signal(SIGKILL);
    host_->program().wait();
    const ProgramResult result = program->wait();
    EXPECT_EQ(result.status, 3) << result.out;
    EXPECT_THAT(result.err, testing::StartsWith("zavctl: the "));

    // The sockets of the one that was killed are still there.
    host_->start();
    repeat(content);
}

TEST_F(PushFaults, AnInterruptedPushCanBeRepeated) {
    const std::string content = randomBytes(5 * kBatch);
    endlessFile(content);
    start();
    const auto program = startEndless();
    program->signal(SIGINT);
    EXPECT_EQ(program->wait().status, 128 + SIGINT);
    repeat(content);
}

TEST_F(PushFaults, EightPushesAtOnceArriveWhole) {
    start();
    const std::size_t size = kLargeFile / 16 + 12'345;
    std::vector<std::unique_ptr<Program>> programs;
    for (unsigned i = 0; i < 8; ++i) {
        const std::string name = "file" + std::to_string(i);
        files_.write(name, randomBytes(size, i));
        files_.write("tree" + std::to_string(i) + "/sub/" + name, name);
    }
    for (unsigned i = 0; i < 8; ++i) {
        programs.push_back(startPush(files_.path("file" + std::to_string(i))));
        programs.push_back(startPush(files_.path("tree" + std::to_string(i))));
    }
    for (const auto& program : programs) {
        const ProgramResult result = program->wait();
        EXPECT_EQ(result.status, 0) << result.err;
    }
    for (unsigned i = 0; i < 8; ++i) {
        const std::string name = "file" + std::to_string(i);
        EXPECT_TRUE(depot(name) == randomBytes(size, i)) << name;
        EXPECT_EQ(depot("tree" + std::to_string(i) + "/sub/" + name), name);
    }
}

TEST_F(PushFaults, TransfersLeaveNothingInTheHost) {
    const std::string content = randomBytes(kLargeFile);
    const std::string file = files_.write("large", content);
    const std::string small = files_.write("small", "x");
    start();
    push(small);
    const int threads = host_->threads();
    const int descriptors = host_->openDescriptors();
    const long peak = peakKiB();

    ASSERT_EQ(push(file).status, 0);
    EXPECT_TRUE(depot("large") == content);
    if (kMeasuresMemory) {
        EXPECT_LT(peakKiB(), peak + 32 * 1024);
    }
    for (int i = 0; i < 100; ++i)
        ASSERT_EQ(push(small).status, 0);
    endlessFile("");
    for (int i = 0; i < 5; ++i) {
        std::filesystem::remove(files_.path("depot/large"));
        const auto program = startEndless();
        program->signal(SIGKILL);
        program->wait();
    }
    EXPECT_TRUE(eventually([&] { return host_->openDescriptors() <= descriptors; }))
        << host_->openDescriptors() << " descriptors, " << descriptors << " before";
    EXPECT_EQ(host_->threads(), threads);
    EXPECT_EQ(host_->children(), 0);
    if (kMeasuresMemory) {
        EXPECT_LT(host_->residentKiB(), peak + 8 * 1024);
    }
}

}  // namespace
