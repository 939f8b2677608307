// ctest-label: threaded
#include <arpa/inet.h>
#include <dirent.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <csignal>
#include <fstream>
#include <mutex>
#include <string>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include "embedded/ncs_host.h"
#include "ncs/memory.h"
#include "platform/ncs_packets.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using namespace ncs_test;
using namespace std::chrono_literals;

constexpr uuid__t kGate = {0xAABBCCDD, 1, 2, 3, {4, 5, 6, 7, 8, 9, 10}};

/// A stub that waits until it is let go, so that calls can be held in their middle.
struct Gate {
    std::mutex lock;
    std::condition_variable changed;
    int waiting = 0;
    int mostAtATime = 0;  ///< that have waited since the gate was closed
    bool isOpen = false;

    void pass() {
        std::unique_lock<std::mutex> guard(lock);
        mostAtATime = std::max(mostAtATime, ++waiting);
        changed.notify_all();
        changed.wait(guard, [this] { return isOpen; });
        --waiting;
    }
    void await(int callers) {
        std::unique_lock<std::mutex> guard(lock);
        EXPECT_TRUE(changed.wait_for(guard, 20s, [&] { return waiting == callers; }));
    }
    void close() {
        const std::lock_guard<std::mutex> guard(lock);
        mostAtATime = 0;
        isOpen = false;
    }
    void open() {
        const std::lock_guard<std::mutex> guard(lock);
        isOpen = true;
        changed.notify_all();
    }
};

Gate& gate() {
    static Gate instance;
    return instance;
}

std::uint32_t gateStub(const rpc__request*, const void*, rpc__reply* reply) {
    gate().pass();
    reply->length = 0;
    return rpc__s_ok;
}

void registerClosedGate() {
    gate().close();
    static constexpr rpc__server_stub kStubs[] = {gateStub};
    static constexpr rpc__server_epv kVector = {kStubs, 1};
    static constexpr rpc__if_spec kSpecification = {"gate", kGate, 1, 1};
    std::uint32_t status = 1;
    rpc__register_mgr(&uuid__nil, &kSpecification, &kVector, nullptr, &status);
    ASSERT_EQ(status, 0U);
}

/// A blocking client.
class Client {
public:
    explicit Client(int socket) : socket_(socket) {
        const timeval patience{10, 0};
        ::setsockopt(socket_, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience);
    }
    ~Client() { close(); }
    Client(Client&& other) noexcept : socket_(std::exchange(other.socket_, -1)) {}
    Client(const Client&) = delete;
    Client& operator=(const Client&) = delete;

    void send(const std::string& bytes) {
        for (std::size_t at = 0; at < bytes.size();) {
            const ssize_t count =
                ::send(socket_, bytes.data() + at, bytes.size() - at, MSG_NOSIGNAL);
            if (count <= 0) return;
            at += static_cast<std::size_t>(count);
        }
    }
    /// The next packet; type 255 at the end of the connection.
    Reply receive() {
        Reply none;
        none.type = 255;
        while (buffer_.size() < 16 || buffer_.size() < lengthOfNext()) {
            char part[70'000];
            const ssize_t count = ::recv(socket_, part, sizeof part, 0);
            if (count <= 0) return none;
            buffer_.append(part, static_cast<std::size_t>(count));
        }
        const std::size_t length = lengthOfNext();
        const Reply reply = replies(buffer_.substr(0, length))[0];
        buffer_.erase(0, length);
        return reply;
    }
    bool bind(const uuid__t& interface = kEcho) {
        Context context;
        context.interface = interface;
        send(bindPacket({context}));
        const Reply answer = receive();
        return answer.type == kBindAck && answer.callId == 7;
    }
    std::string repeat(const std::string& stub) {
        send(requestPackets(kRepeat, stub));
        std::string answer;
        for (;;) {
            const Reply reply = receive();
            if (reply.type != kResponse) return "type " + std::to_string(reply.type);
            answer += reply.stub();
            if ((reply.flags & 2) != 0) return answer;
        }
    }
    /// Whether the server has closed the connection by then.
    bool isClosedWithin(std::chrono::milliseconds time) {
        pollfd waiting{socket_, POLLIN, 0};
        const auto deadline = std::chrono::steady_clock::now() + time;
        while (std::chrono::steady_clock::now() < deadline) {
            if (::poll(&waiting, 1, 20) <= 0) continue;
            char byte = 0;
            if (::recv(socket_, &byte, 1, 0) <= 0) return true;
        }
        return false;
    }
    void close() {
        if (socket_ != -1) ::close(std::exchange(socket_, -1));
    }
    int socket() const { return socket_; }

private:
    std::size_t lengthOfNext() const {
        const auto byte = [this](std::size_t i) {
            return static_cast<std::size_t>(static_cast<unsigned char>(buffer_[i]));
        };
        return byte(8) | byte(9) << 8;
    }
    int socket_;
    std::string buffer_;
};

class AServer : public testing::Test {
protected:
    AServer() {
        registerEcho();
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        scratch.path("rpc").copy(address.sun_path, sizeof address.sun_path - 1);
        listener = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        EXPECT_EQ(::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
        EXPECT_EQ(::listen(listener, 128), 0);
    }
    ~AServer() override {
        server.reset();
        ::close(listener);
    }
    void start(const ncs::Limits& limits = {}) {
        server = std::make_unique<ncs::Server>(limits);
        server->listen(listener);
    }
    Client connect() {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        scratch.path("rpc").copy(address.sun_path, sizeof address.sun_path - 1);
        const int made = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        EXPECT_EQ(::connect(made, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
        return Client(made);
    }
    /// Waits until the counts are as wanted.
    template <typename Condition>
    bool becomes(Condition condition) {
        return eventually([&] { return condition(server->counts()); });
    }

    ScratchDir scratch;
    int listener = -1;
    std::unique_ptr<ncs::Server> server;
};

std::size_t openDescriptors() {
    std::size_t count = 0;
    DIR* const directory = ::opendir("/proc/self/fd");
    while (::readdir(directory) != nullptr)
        ++count;
    ::closedir(directory);
    return count;
}

/// The lines of /proc/self/task/*/status that begin with `field`, of the server's threads.
std::vector<std::string> statusOfThreads(const std::string& field) {
    std::vector<std::string> found;
    DIR* const tasks = ::opendir("/proc/self/task");
    while (const dirent* const task = ::readdir(tasks)) {
        std::ifstream status("/proc/self/task/" + std::string(task->d_name) + "/status");
        std::string line;
        if (!std::getline(status, line) || line != "Name:\tncs") continue;
        while (std::getline(status, line)) {
            if (line.rfind(field, 0) == 0) found.push_back(line.substr(field.size()));
        }
    }
    ::closedir(tasks);
    return found;
}

TEST_F(AServer, AnswersOverAUnixSocket) {
    start();
    Client client = connect();
    ASSERT_TRUE(client.bind());
    EXPECT_EQ(client.repeat("hello"), "hello");
    EXPECT_EQ(server->counts().connections, 1U);
    EXPECT_EQ(server->counts().accepted, 1U);
    EXPECT_EQ(server->counts().calls, 1U);
}

TEST_F(AServer, AnswersOverTcpOnLoopbackAndNamesItsPort) {
    start();
    const std::uint16_t port = server->listenOnLoopback(0);
    ASSERT_NE(port, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    Client client(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    ASSERT_EQ(::connect(client.socket(), reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    client.send(bindPacket());
    const Reply answer = client.receive();
    ASSERT_EQ(answer.type, kBindAck);
    EXPECT_EQ(answer.body.substr(10, answer.number(8, 2)), std::to_string(port) + '\0');
    EXPECT_EQ(client.repeat("hello"), "hello");
}

/// What becomes of a connection to the port that another user's process makes.
std::string fateOfForeignConnection(std::uint16_t port, bool leavesAtOnce) {
    const std::string hello = bindPacket();
    const pid_t child = ::fork();
    if (child == 0) {
        constexpr uid_t kNobody = 65534;
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        if (::setresgid(kNobody, kNobody, kNobody) != 0) ::_exit(1);
        if (::setresuid(kNobody, kNobody, kNobody) != 0) ::_exit(1);
        const int socket = ::socket(AF_INET, SOCK_STREAM, 0);
        if (::connect(socket, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
            ::_exit(2);
        }
        (void)!::write(socket, hello.data(), hello.size());
        if (leavesAtOnce) ::_exit(0);
        char byte;
        ::_exit(::read(socket, &byte, 1) > 0 ? 3 : 0);
    }
    int status = 0;
    ::waitpid(child, &status, 0);
    switch (WEXITSTATUS(status)) {
        case 0:
            return "closed";
        case 3:
            return "served";
        default:
            return "not tried";
    }
}

TEST_F(AServer, ServesNoOtherUserOverTcp) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
    start();
    const std::uint16_t port = server->listenOnLoopback(0);
    EXPECT_EQ(fateOfForeignConnection(port, false), "closed");
    // Who has left already must not be taken for root, whom the kernel names in his place.
    for (int i = 0; i < 20; ++i)
        EXPECT_EQ(fateOfForeignConnection(port, true), "closed");
    EXPECT_TRUE(eventually([this] { return server->counts().refused == 21; }));
    EXPECT_EQ(server->counts().accepted, 0U);
}

TEST_F(AServer, ListensOnTcpOnLoopbackOnly) {
    start();
    const std::uint16_t port = server->listenOnLoopback(0);
    std::ifstream table("/proc/net/tcp");
    char hexadecimal[16];
    std::snprintf(hexadecimal, sizeof hexadecimal, ":%04X ", port);
    int found = 0;
    for (std::string line; std::getline(table, line);) {
        if (line.find(hexadecimal) == std::string::npos || line.find(" 0A ") == std::string::npos) {
            continue;
        }
        ++found;
        EXPECT_NE(line.find(" 0100007F" + std::string(hexadecimal)), std::string::npos) << line;
    }
    EXPECT_EQ(found, 1);
}

TEST_F(AServer, APortInUseIsAnError) {
    start();
    const std::uint16_t port = server->listenOnLoopback(0);
    EXPECT_THROW(server->listenOnLoopback(port), std::system_error);
    EXPECT_THROW(server->listen(-1), std::system_error);
}

TEST_F(AServer, ServesSeveralAssociationsAtOnce) {
    start();
    std::vector<std::thread> threads;
    for (int t = 0; t < 12; ++t) {
        threads.emplace_back([this, t] {
            Client client = connect();
            ASSERT_TRUE(client.bind());
            for (int i = 0; i < 50; ++i) {
                const std::string stub(static_cast<std::size_t>(i * 997 + t),
                                       static_cast<char>('a' + t));
                ASSERT_EQ(client.repeat(stub), stub);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(server->counts().calls, 600U);
}

TEST_F(AServer, TakesRequestsOfSeveralMegabytes) {
    start();
    Client client = connect();
    ASSERT_TRUE(client.bind());
    const std::string stub(std::size_t{4} << 20, 'm');
    EXPECT_EQ(client.repeat(stub).size(), 65'536U);
    EXPECT_EQ(client.repeat(stub + "x"), "type 3");
    EXPECT_EQ(client.repeat("small"), "small");
}

TEST_F(AServer, TakesBytesOneByOne) {
    start();
    Client client = connect();
    for (const char c : bindPacket() + requestPackets(kRepeat, "slow", 3)) {
        client.send(std::string(1, c));
    }
    EXPECT_EQ(client.receive().type, kBindAck);
    EXPECT_EQ(client.receive().stub(), "slow");
}

TEST_F(AServer, AnswersWhatCameBeforeTheClientClosedItsSide) {
    start();
    Client client = connect();
    client.send(bindPacket() + requestPackets(kRepeat, "last words"));
    ::shutdown(client.socket(), SHUT_WR);
    EXPECT_EQ(client.receive().type, kBindAck);
    EXPECT_EQ(client.receive().stub(), "last words");
    EXPECT_EQ(client.receive().type, 255);
}

TEST_F(AServer, ClientsThatVanishLeaveNothingBehind) {
    ncs::Limits limits;
    limits.connections = 100;
    start(limits);
    const std::size_t before = openDescriptors();
    const std::string talk = bindPacket() + requestPackets(kRepeat, std::string(200'000, 'v'));
    for (std::size_t i = 0; i < 100; ++i) {
        Client client = connect();
        client.send(talk.substr(0, i * talk.size() / 100));
    }
    EXPECT_TRUE(becomes([](const ncs::Counts& counts) {
        return counts.accepted == 100 && counts.connections == 0;
    }));
    EXPECT_EQ(openDescriptors(), before);
    EXPECT_EQ(ncs::keptBytes(), 0U);
}

TEST_F(AServer, AClientThatTakesNoAnswersIsCutAndHoldsUpNobody) {
    ncs::Limits limits;
    limits.workers = 1;
    limits.answerTime = 300ms;
    start(limits);
    Client lazy = connect();
    ASSERT_TRUE(lazy.bind());
    std::thread sender([&lazy] {
        std::string flood;
        for (std::uint32_t i = 0; i < 2000; ++i)
            flood += fragment(3, kFill, "", i);
        lazy.send(flood);
    });
    Client other = connect();
    ASSERT_TRUE(other.bind());
    for (int i = 0; i < 20; ++i)
        EXPECT_EQ(other.repeat("quick"), "quick");
    EXPECT_TRUE(becomes([](const ncs::Counts& counts) { return counts.timedOut == 1; }));
    sender.join();
    EXPECT_EQ(other.repeat("still here"), "still here");
}

TEST_F(AServer, WhoDoesNotBindInTimeIsCut) {
    ncs::Limits limits;
    limits.bindTime = 2s;
    start(limits);
    Client silent = connect();
    Client talking = connect();
    ASSERT_TRUE(talking.bind());
    EXPECT_TRUE(silent.isClosedWithin(20s));
    EXPECT_EQ(talking.repeat("hello"), "hello");
    EXPECT_EQ(server->counts().timedOut, 1U);
}

TEST_F(AServer, WhoTricklesARequestIsCutHoweverBusyItLooks) {
    ncs::Limits limits;
    limits.requestTime = 300ms;
    start(limits);
    Client slow = connect();
    ASSERT_TRUE(slow.bind());
    slow.send(fragment(1, kRepeat, std::string(1000, 'x')).substr(0, 100));
    EXPECT_TRUE(eventually([&slow] {
        slow.send("x");
        return slow.isClosedWithin(50ms);
    }));
}

TEST_F(AServer, WhoIsIdleTooLongIsCutButNotWhoWorks) {
    ncs::Limits limits;
    limits.idleTime = 2s;
    start(limits);
    Client idle = connect();
    Client busy = connect();
    ASSERT_TRUE(idle.bind());
    ASSERT_TRUE(busy.bind());
    EXPECT_TRUE(eventually([&] {
        EXPECT_EQ(busy.repeat("work"), "work");
        return idle.isClosedWithin(50ms);
    }));
    EXPECT_EQ(busy.repeat("work"), "work");
    EXPECT_EQ(server->counts().timedOut, 1U);
}

TEST_F(AServer, ACallMayTakeLongerThanAnyWait) {
    registerClosedGate();
    ncs::Limits limits;
    limits.idleTime = limits.requestTime = limits.answerTime = 500ms;
    start(limits);
    Client client = connect();
    ASSERT_TRUE(client.bind(kGate));
    client.send(fragment(3, 0, ""));
    gate().await(1);
    // This one begins to wait after the call has begun, and its time is over.
    Client idle = connect();
    ASSERT_TRUE(idle.bind());
    EXPECT_TRUE(idle.isClosedWithin(20s));
    EXPECT_EQ(server->counts().timedOut, 1U);
    gate().open();
    EXPECT_EQ(client.receive().type, kResponse);
}

TEST_F(AServer, BeyondItsLimitConnectionsAreClosedAtOnce) {
    ncs::Limits limits;
    limits.connections = 2;
    start(limits);
    Client first = connect();
    Client second = connect();
    ASSERT_TRUE(first.bind());
    ASSERT_TRUE(second.bind());
    Client third = connect();
    EXPECT_TRUE(third.isClosedWithin(20s));
    EXPECT_EQ(server->counts().refused, 1U);
    first.close();
    ASSERT_TRUE(becomes([](const ncs::Counts& counts) { return counts.connections == 1; }));
    Client fourth = connect();
    EXPECT_TRUE(fourth.bind());
}

TEST_F(AServer, AsManyCallsRunAtATimeAsThereAreWorkers) {
    registerClosedGate();
    ncs::Limits limits;
    limits.workers = 3;
    start(limits);
    std::vector<Client> clients;
    for (int i = 0; i < 5; ++i) {
        clients.push_back(connect());
        ASSERT_TRUE(clients.back().bind(kGate));
    }
    for (Client& client : clients)
        client.send(fragment(3, 0, ""));
    gate().await(3);
    EXPECT_EQ(statusOfThreads("State:").size(), 3U) << "there is none for another call";
    gate().open();
    for (Client& client : clients)
        EXPECT_EQ(client.receive().type, kResponse);
    EXPECT_EQ(gate().mostAtATime, 3);
}

TEST_F(AServer, StopLetsRunningCallsEndAndClosesEverything) {
    registerClosedGate();
    start();
    const std::uint16_t port = server->listenOnLoopback(0);
    Client running = connect();
    Client idle = connect();
    ASSERT_TRUE(running.bind(kGate));
    ASSERT_TRUE(idle.bind());
    running.send(fragment(3, 0, ""));
    gate().await(1);
    std::thread opener([] {
        // Of the server's threads only the call's goes on: stop() has begun and waits for it.
        EXPECT_TRUE(eventually([] { return statusOfThreads("State:").size() == 1; }));
        gate().open();
    });
    server->stop();
    opener.join();
    EXPECT_EQ(running.receive().type, kResponse);
    EXPECT_TRUE(running.isClosedWithin(20s));
    EXPECT_TRUE(idle.isClosedWithin(20s));
    EXPECT_EQ(server->counts().connections, 0U);
    server->stop();
    ncs::Server other;
    EXPECT_EQ(other.listenOnLoopback(port), port);
}

TEST_F(AServer, OutOfDescriptorsItWaitsAndGoesOn) {
    ncs::Limits limits;
    limits.workers = 1;  // so that what comes first is dealt with first
    start(limits);
    Client before = connect();
    ASSERT_TRUE(before.bind());
    rlimit old{};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &old), 0);
    Client waiting(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    rlimit none = old;
    none.rlim_cur = static_cast<rlim_t>(waiting.socket()) + 1;
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    scratch.path("rpc").copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(::connect(waiting.socket(), reinterpret_cast<sockaddr*>(&address), sizeof address),
              0);
    EXPECT_EQ(before.repeat("still served"), "still served") << "after accepting has failed";
    EXPECT_EQ(server->counts().accepted, 1U);
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &old), 0);
    EXPECT_TRUE(waiting.bind());
}

std::vector<std::string> wakeUpsOfThreads() {
    return statusOfThreads("voluntary_ctxt_switches:");
}

TEST_F(AServer, AtRestNoThreadIsWoken) {
    start();
    {
        Client client = connect();
        ASSERT_TRUE(client.bind());
    }
    ASSERT_TRUE(becomes([](const ncs::Counts& counts) { return counts.connections == 0; }));
    std::vector<std::string> before;
    const auto isStill = [&before] {
        const std::vector<std::string> last = std::exchange(before, wakeUpsOfThreads());
        return before == last;
    };
    // The last connection's end may still be on its way through the threads. That none is woken
    // shows only in time: the pauses are what the counts of wake-ups are compared over.
    ASSERT_TRUE(eventually([&isStill] {
        std::this_thread::sleep_for(100ms);
        return isStill();
    }));
    EXPECT_EQ(before.size(), 8U);
    std::this_thread::sleep_for(500ms);
    EXPECT_TRUE(isStill());
}

/// Of another user than this process; needs root.
TEST_F(AServer, PeersOfAnotherUserAreRefused) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can be another user";
    start();
    ASSERT_EQ(::chmod(scratch.path().c_str(), 0777), 0);
    ASSERT_EQ(::chmod(scratch.path("rpc").c_str(), 0777), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        if (::setresuid(65534, 65534, 65534) != 0) ::_exit(2);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        scratch.path("rpc").copy(address.sun_path, sizeof address.sun_path - 1);
        const int made = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        if (::connect(made, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) ::_exit(3);
        char byte = 0;
        ::_exit(::recv(made, &byte, 1, 0) <= 0 ? 0 : 4);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(WEXITSTATUS(status), 0);
    EXPECT_EQ(server->counts().refused, 1U);
    Client own = connect();
    EXPECT_TRUE(own.bind());
}

TEST_F(AServer, LetsAListenerJudgeItsPeers) {
    std::atomic<bool> welcome{false};
    std::atomic<int> asked{0};
    server = std::make_unique<ncs::Server>();
    server->listen(listener, [&](int accepted) {
        ucred peer{};
        socklen_t length = sizeof peer;
        if (::getsockopt(accepted, SOL_SOCKET, SO_PEERCRED, &peer, &length) == 0 &&
            peer.pid == ::getpid()) {
            ++asked;
        }
        return welcome.load();
    });
    EXPECT_FALSE(connect().bind()) << "although it is the same user";
    EXPECT_TRUE(becomes([](const ncs::Counts& counts) { return counts.refused == 1; }));
    welcome = true;
    Client served = connect();
    EXPECT_TRUE(served.bind());
    EXPECT_EQ(asked, 2);
}

TEST_F(AServer, ItsThreadsLeaveSignalsToTheOthers) {
    start();
    // A thread has its name only once it runs.
    ASSERT_TRUE(becomes([](const ncs::Counts&) { return statusOfThreads("SigBlk:").size() == 8; }));
    for (const std::string& text : statusOfThreads("SigBlk:")) {
        const unsigned long long mask = std::stoull(text, nullptr, 16);
        EXPECT_NE(mask & 1ULL << (SIGTERM - 1), 0U);
        EXPECT_NE(mask & 1ULL << (SIGINT - 1), 0U);
    }
}

}  // namespace
