#include "fleet/bus/nats/connection.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/nats/connecting.h"
#include "support/fleet/nats_server.h"
#include "support/host/program.h"

using namespace std::chrono_literals;
using connecting::connected;
using connecting::kPatience;
using connecting::optionsFor;
using fleet::BusMessage;
using fleet::BusStatus;
using fleet::Connection;
using fleet::ConnectionOptions;
using Failure = fleet::Connection::Result::Failure;
using Kind = fleet::BusStatus::Kind;

namespace {

TEST(PauseBeforeAnAttempt, IsDrawnFromEverLongerTimes) {
    fleet::ConnectionOptions options;
    options.reconnectWait = std::chrono::milliseconds(2000);
    options.reconnectJitter = std::chrono::milliseconds(3000);
    constexpr int kLongest[] = {0, 5000, 8000, 14000, 26000, 50000, 50000, 50000};
    for (int attempt = 1; attempt < 8; ++attempt) {
        std::chrono::milliseconds most{0};
        for (int i = 0; i < 1000; ++i) {
            const auto pause = fleet::pauseBefore(options, attempt);
            ASSERT_GE(pause, options.reconnectWait);
            most = std::max(most, pause);
        }
        EXPECT_LE(most.count(), kLongest[attempt]);
        // Of a thousand draws one at least is in the upper half.
        EXPECT_GT(most.count(), kLongest[attempt] / 2);
    }
}

TEST(PauseBeforeAnAttempt, IsOneThatCanBeWaitedForWhateverTheOptionsSay) {
    fleet::ConnectionOptions options;
    options.reconnectJitter = std::chrono::hours(24 * 365);
    EXPECT_GE(fleet::pauseBefore(options, 1'000'000), options.reconnectWait);
    options.reconnectJitter = std::chrono::milliseconds(-1);
    EXPECT_EQ(fleet::pauseBefore(options, -1), options.reconnectWait);
}

/// What was received, for the thread of the test.
class Received {
public:
    Connection::Receiver receiver() {
        return [this](const BusMessage& message) {
            const std::lock_guard lock(mutex_);
            texts_.push_back(message.data);
        };
    }
    bool awaits(std::size_t count) {
        return eventually([&] { return texts().size() >= count; });
    }
    std::vector<std::string> texts() {
        const std::lock_guard lock(mutex_);
        return texts_;
    }

private:
    std::mutex mutex_;
    std::vector<std::string> texts_;
};

/// Answers each request with its own text behind "re: ".
std::unique_ptr<fleet::Subscription> answering(Connection& connection, const std::string& subject) {
    auto subscribed = connection.subscribe(
        subject,
        [&connection](const BusMessage& message) {
            connection.publish(message.reply, "re: " + message.data);
        },
        kPatience);
    return std::move(subscribed.subscription);
}

const char kOneWithLimits[] = R"(
authorization { users: [
  { user: all, password: p }
  { user: few, password: p, permissions: { publish: ["may.>", "_INBOX.>"], subscribe: ["may.>", "_I.few.>"] } }
] })";

ConnectionOptions fewRights(const NatsServer& server) {
    ConnectionOptions options = optionsFor(server);
    options.credentials = fleet::UserPassword{"few", "p"};
    options.inboxPrefix = "_I.few";
    return options;
}

}  // namespace

TEST(BusConnection, CarriesMessagesInTheirOrder) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    Received received;
    const auto subscribed = connection->subscribe("a.*", received.receiver(), kPatience);
    ASSERT_TRUE(subscribed.status.done()) << subscribed.status.text;
    for (const char* text : {"one", "two", "three"}) {
        ASSERT_TRUE(connection->publish("a.b", text).done());
    }
    ASSERT_TRUE(received.awaits(3));
    EXPECT_EQ(received.texts(), (std::vector<std::string>{"one", "two", "three"}));
}

TEST(BusConnection, CarriesHeadersAndAnyBytes) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    const auto echo = connection->subscribe(
        "echo",
        [&](const BusMessage& message) {
            connection->publish(message.reply, message.data, message.headers);
        },
        kPatience);
    const std::string bytes("\0\r\n\xff", 4);
    const auto reply = connection->request("echo", bytes, kPatience, {{"A-Key", "its value"}});
    ASSERT_TRUE(reply.status.done()) << reply.status.text;
    EXPECT_EQ(reply.message.data, bytes);
    ASSERT_NE(reply.message.header("A-Key"), nullptr);
    EXPECT_EQ(*reply.message.header("A-Key"), "its value");
}

TEST(BusConnection, GivesEachOfManyRequestsItsOwnAnswer) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    const auto echo = answering(*connection, "echo");
    ASSERT_TRUE(echo);
    std::atomic<int> right{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < 50; ++i) {
                const std::string text = std::to_string(t) + "/" + std::to_string(i);
                const auto reply = connection->request("echo", text, kPatience);
                if (reply.status.done() && reply.message.data == "re: " + text) ++right;
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(right, 200);
}

TEST(BusConnection, SaysAtOnceThatNobodyListens) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    const auto reply = connection->request("nobody", "", std::chrono::hours(1));
    EXPECT_EQ(reply.status.kind, Kind::NoAnswer);
    EXPECT_NE(reply.status.text.find("nobody listens"), std::string::npos) << reply.status.text;
}

TEST(BusConnection, EndsARequestAtItsDeadline) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    const auto silent = connection->subscribe(
        "silent", [](const BusMessage&) {}, kPatience);
    const auto reply = connection->request("silent", "", 20ms);
    EXPECT_EQ(reply.status.kind, Kind::NoAnswer);
    EXPECT_EQ(reply.status.text, "no answer in time");
}

TEST(BusConnection, TellsAMissingPermissionOfARequestInPlaceOfATimeOut) {
    const NatsServer server(kOneWithLimits);
    const auto connection = connected(fewRights(server));
    const auto reply = connection->request("mayNot", "", std::chrono::hours(1));
    EXPECT_EQ(reply.status.kind, Kind::Forbidden);
    EXPECT_NE(reply.status.text.find("\"mayNot\""), std::string::npos) << reply.status.text;
}

TEST(BusConnection, TellsAMissingPermissionOfASubscription) {
    const NatsServer server(kOneWithLimits);
    const auto connection = connected(fewRights(server));
    const auto refused = connection->subscribe(
        "other.>", [](const BusMessage&) {}, kPatience);
    EXPECT_EQ(refused.status.kind, Kind::Forbidden);
    EXPECT_FALSE(refused.subscription);
    const auto allowed = connection->subscribe(
        "may.>", [](const BusMessage&) {}, kPatience);
    EXPECT_EQ(allowed.status.kind, Kind::Done) << allowed.status.text;
}

TEST(BusConnection, TellsThatItMayNotHearItsAnswers) {
    const NatsServer server(kOneWithLimits);
    ConnectionOptions options = fewRights(server);
    options.inboxPrefix = "_I.another";
    const auto connection = connected(options);
    const auto all = [&] {
        ConnectionOptions one = optionsFor(server);
        one.credentials = fleet::UserPassword{"all", "p"};
        return connected(one);
    }();
    const auto silent = all->subscribe(
        "may.ask", [](const BusMessage&) {}, kPatience);
    for (int i = 1; i <= 2; ++i) {
        const auto reply = connection->request("may.ask", "", std::chrono::hours(1));
        EXPECT_EQ(reply.status.kind, Kind::Forbidden) << "request " << i;
    }
}

TEST(BusConnection, TellsEachOfManyRequestsThatItsPermissionIsMissing) {
    const NatsServer server(kOneWithLimits);
    const auto connection = connected(fewRights(server));
    std::vector<fleet::Connection::Request> requests;
    for (int i = 0; i < 50; ++i)
        requests.push_back({"mayNot." + std::to_string(i), "", {}});
    const auto replies = connection->requestAll(requests, std::chrono::hours(1));
    for (std::size_t i = 0; i < replies.size(); ++i) {
        EXPECT_EQ(replies[i].status.kind, Kind::Forbidden);
        EXPECT_NE(replies[i].status.text.find('"' + requests[i].subject + '"'), std::string::npos)
            << replies[i].status.text;
    }
}

TEST(BusConnection, TellsAMissingPermissionOfAPublishAsAnError) {
    const NatsServer server(kOneWithLimits);
    ConnectionOptions options = fewRights(server);
    std::mutex mutex;
    std::string error;
    options.events.error = [&](const std::string& what) {
        const std::lock_guard lock(mutex);
        error = what;
    };
    const auto connection = connected(options);
    ASSERT_TRUE(connection->publish("mayNot", "").done());
    EXPECT_TRUE(eventually([&] {
        const std::lock_guard lock(mutex);
        return error.find("\"mayNot\"") != std::string::npos;
    }));
}

TEST(BusConnection, RefusesSubjectsAndHeadersThatWouldBecomeCommands) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    EXPECT_EQ(connection->publish("a\r\nPUB b 0", "").kind, Kind::Refused);
    EXPECT_EQ(connection->publish("a", "", {{"k", "v\r\nx: y"}}).kind, Kind::Refused);
    EXPECT_EQ(connection->request("a b", "", kPatience).status.kind, Kind::Refused);
    EXPECT_EQ(connection
                  ->subscribe(
                      "a b", [](const BusMessage&) {}, kPatience)
                  .status.kind,
              Kind::Refused);
    EXPECT_TRUE(connection->flush(kPatience).done());
}

TEST(BusConnection, RefusesWhatIsLargerThanTheServerTakes) {
    const NatsServer server("max_payload: 1024");
    const auto connection = connected(optionsFor(server));
    EXPECT_EQ(connection->publish("a", std::string(2048, 'x')).kind, Kind::Refused);
}

TEST(BusConnection, CountsWhatASlowReceiverHasNoRoomFor) {
    const NatsServer server;
    ConnectionOptions options = optionsFor(server);
    std::atomic<bool> complained{false};
    options.events.error = [&](const std::string&) { complained = true; };
    const auto connection = connected(options);
    std::mutex gate;
    std::unique_lock closed(gate);
    std::atomic<int> got{0};
    const auto slow = connection->subscribe("a",
                                            [&](const BusMessage&) {
                                                const std::lock_guard wait(gate);
                                                ++got;
                                            },
                                            kPatience, {10, 1 << 20});
    ASSERT_TRUE(slow.status.done());
    for (int i = 0; i < 100; ++i)
        ASSERT_TRUE(connection->publish("a", "x").done());
    ASSERT_TRUE(connection->flush(kPatience).done());
    EXPECT_TRUE(eventually([&] { return complained.load(); }));
    closed.unlock();
    EXPECT_TRUE(eventually(
        [&] { return static_cast<std::uint64_t>(got) + slow.subscription->dropped() == 100U; }));
    EXPECT_GE(slow.subscription->dropped(), 88U);
}

TEST(BusConnection, DeliversNothingOnceASubscriptionIsGone) {
    const NatsServer server;
    const auto connection = connected(optionsFor(server));
    for (int round = 0; round < 50; ++round) {
        auto alive = std::make_unique<std::atomic<int>>(0);
        auto subscribed = connection->subscribe(
            "a", [&](const BusMessage&) { ++*alive; }, kPatience);
        for (int i = 0; i < 20; ++i)
            ASSERT_TRUE(connection->publish("a", "x").done());
        subscribed.subscription.reset();
        alive.reset();  // a callback that still ran would touch what is gone
    }
    EXPECT_TRUE(connection->flush(kPatience).done());
}

TEST(BusConnection, DeliversByThreadsThatConnectionsShare) {
    const NatsServer server;
    ConnectionOptions options = optionsFor(server);
    options.sharesThreads = true;
    std::vector<std::unique_ptr<Connection>> connections;
    for (int i = 0; i < 20; ++i)
        connections.push_back(connected(options));
    const auto echo = answering(*connections.front(), "echo");
    ASSERT_TRUE(echo);
    for (int round = 0; round < 5; ++round) {
        for (auto& connection : connections) {
            auto alive = std::make_unique<std::atomic<int>>(0);
            auto subscribed = connection->subscribe(
                "a", [&](const BusMessage&) { ++*alive; }, kPatience);
            for (int i = 0; i < 20; ++i)
                ASSERT_TRUE(connection->publish("a", "x").done());
            EXPECT_EQ(connection->request("echo", "y", kPatience).message.data, "re: y");
            subscribed.subscription.reset();
            alive.reset();  // a callback that still ran would touch what is gone
        }
    }
}

TEST(BusConnection, SendsWhatWasPublishedBeforeItCloses) {
    const NatsServer server;
    const auto hears = connected(optionsFor(server));
    for (int round = 0; round < 20; ++round) {
        Received received;
        const auto subscribed = hears->subscribe("a", received.receiver(), kPatience);
        const auto speaks = connected(optionsFor(server));
        for (int i = 0; i < 200; ++i)
            ASSERT_TRUE(speaks->publish("a", std::to_string(i)).done());
        ASSERT_TRUE(speaks->close(kPatience).done());
        EXPECT_TRUE(received.awaits(200)) << received.texts().size();
    }
}

TEST(BusConnection, IsOfNoUseOnceItIsClosed) {
    const NatsServer server;
    ConnectionOptions options = optionsFor(server);
    int closed = 0;
    options.events.closed = [&](const std::string&) { ++closed; };
    const auto connection = connected(options);
    EXPECT_TRUE(connection->close(kPatience).done());
    EXPECT_EQ(closed, 1) << "the last event is over when close() is";
    EXPECT_EQ(connection->publish("a", "").kind, Kind::NoAnswer);
    EXPECT_EQ(connection->request("a", "", kPatience).status.kind, Kind::NoAnswer);
    EXPECT_EQ(connection->flush(kPatience).kind, Kind::NoAnswer);
    EXPECT_EQ(connection->close(kPatience).kind, Kind::NoAnswer);
    EXPECT_EQ(closed, 1);
}

TEST(BusConnection, ComesBackHoweverOftenItTriesInVain) {
    NatsServer server;
    ConnectionOptions options = optionsFor(server);
    std::atomic<int> left{0};
    std::atomic<int> back{0};
    std::atomic<int> closed{0};
    options.events.disconnected = [&] { ++left; };
    options.events.reconnected = [&] { ++back; };
    options.events.closed = [&](const std::string&) { ++closed; };
    const auto connection = connected(options);
    Received received;
    const auto subscribed = connection->subscribe("a", received.receiver(), kPatience);
    server.kill();
    ASSERT_TRUE(eventually([&] { return connection->failedReconnects() > 100; }));
    EXPECT_EQ(left, 1);
    EXPECT_EQ(closed, 0);
    server.start();
    ASSERT_TRUE(eventually([&] { return back == 1; }));
    ASSERT_TRUE(connection->publish("a", "again").done());
    EXPECT_TRUE(received.awaits(1)) << "subscriptions are made again";
}

TEST(BusConnection, KeepsSomeOfWhatIsPublishedWhileThereIsNoServer) {
    NatsServer server;
    ConnectionOptions options = optionsFor(server);
    options.reconnectBuffer = 4096;
    const auto connection = connected(options);
    Received received;
    const auto subscribed = connection->subscribe("a", received.receiver(), kPatience);
    server.kill();
    ASSERT_TRUE(eventually([&] { return connection->failedReconnects() > 0; }));
    ASSERT_TRUE(connection->publish("a", "kept").done());
    ASSERT_TRUE(connection->publish("b", std::string(5000, 'x')).done());
    EXPECT_EQ(connection->publish("a", "too much").kind, Kind::NoAnswer);
    EXPECT_EQ(connection->request("a", "", kPatience).status.kind, Kind::NoAnswer)
        << "an old question is worth nothing later";
    server.start();
    ASSERT_TRUE(received.awaits(1));
    EXPECT_EQ(received.texts().front(), "kept");
}

TEST(BusConnection, KeepsNothingIfTheBufferIsEmpty) {
    NatsServer server;
    ConnectionOptions options = optionsFor(server);
    options.reconnectBuffer = 0;
    const auto connection = connected(options);
    server.kill();
    ASSERT_TRUE(eventually([&] { return !connection->connected(); }));
    EXPECT_EQ(connection->publish("a", "x").kind, Kind::NoAnswer);
}

TEST(BusConnection, EndsRequestsWhenTheServerGoes) {
    NatsServer server;
    const auto connection = connected(optionsFor(server));
    std::atomic<bool> asked{false};
    const auto silent = connection->subscribe(
        "silent", [&](const BusMessage&) { asked = true; }, kPatience);
    BusStatus status;
    std::thread waits(
        [&] { status = connection->request("silent", "", std::chrono::hours(1)).status; });
    const bool wasAsked = eventually([&] { return asked.load(); });
    server.kill();
    waits.join();
    EXPECT_TRUE(wasAsked);
    EXPECT_EQ(status.kind, Kind::NoAnswer);
}

TEST(BusConnection, SaysWhyItCannotConnect) {
    NatsServer server(kOneWithLimits);
    ConnectionOptions options = optionsFor(server);
    options.credentials = fleet::UserPassword{"all", "wrong"};
    EXPECT_EQ(Connection::connect(options).failure, Failure::Refused);
    server.stop();
    const auto away = Connection::connect(options);
    EXPECT_EQ(away.failure, Failure::Unreachable);
    EXPECT_NE(away.text, "");
    options.urls = {};
    EXPECT_EQ(Connection::connect(options).failure, Failure::Misconfigured);
    options.urls = {server.url()};
    options.inboxPrefix = "a b";
    EXPECT_EQ(Connection::connect(options).failure, Failure::Misconfigured);
}

TEST(BusConnection, EndsWhenTheServerNoLongerTakesTheCredentials) {
    NatsServer server(kOneWithLimits);
    ConnectionOptions options = fewRights(server);
    std::atomic<bool> closed{false};
    options.events.closed = [&](const std::string&) { closed = true; };
    const auto connection = connected(options);
    server.reload("authorization { users: [ { user: all, password: p } ] }");
    EXPECT_TRUE(eventually([&] { return closed.load(); }));
    EXPECT_FALSE(connection->connected());
}

TEST(BusConnection, KeepsItsOptionsApartFromOthers) {
    const NatsServer server(kOneWithLimits);
    ConnectionOptions options = fewRights(server);
    const auto few = connected(options);
    options.credentials = fleet::UserPassword{"all", "p"};
    options.inboxPrefix = "_I.all";
    const auto all = connected(options);
    const auto echo = answering(*all, "may.ask");
    ASSERT_TRUE(echo);
    // Still with its own rights and inbox.
    EXPECT_EQ(few->request("mayNot", "", kPatience).status.kind, Kind::Forbidden);
    EXPECT_EQ(all->request("may.ask", "x", kPatience).message.data, "re: x");
}

// ---- Keys ---------------------------------------------------------------------------------------

namespace {

std::string keyConfiguration(const fleet::KeyPair& key) {
    return "authorization { users: [ { nkey: " + key.publicKey() + " } ] }";
}

}  // namespace

TEST(BusConnectionWithKey, SucceedsWhateverTheSignature) {
    // One signature in 256 begins with a byte of 0, which the client library loses.
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    const NatsServer server(keyConfiguration(key));
    ConnectionOptions options = optionsFor(server);
    options.credentials =
        fleet::UserKey{key.publicKey(), [&](std::string_view nonce) { return key.sign(nonce); }};
    for (int i = 0; i < 600; ++i) {
        const auto result = Connection::connect(options);
        ASSERT_TRUE(result.connection) << i << ": " << result.text;
    }
    EXPECT_EQ(server.log().find("authentication error"), std::string::npos);
}

TEST(BusConnectionWithKey, AsksForAnotherNonceIfTheSignatureCannotBeSent) {
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    const NatsServer server(keyConfiguration(key));
    ConnectionOptions options = optionsFor(server);
    int signatures = 0;
    options.credentials = fleet::UserKey{key.publicKey(), [&](std::string_view nonce) {
                                             if (++signatures <= 2) return std::string(64, '\0');
                                             // So that luck plays no part.
                                             return key.sign(nonce);
                                         }};
    const auto result = Connection::connect(options);
    ASSERT_TRUE(result.connection) << result.text;
    EXPECT_GE(signatures, 3);
    EXPECT_GE(result.connection->unsendableSignatures(), 2U);
    EXPECT_EQ(server.log().find("authentication error"), std::string::npos)
        << "what cannot be sent is not sent";
}

TEST(BusConnectionWithKey, AsksFourTimesAtMost) {
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    const NatsServer server(keyConfiguration(key));
    ConnectionOptions options = optionsFor(server);
    int signatures = 0;
    options.credentials = fleet::UserKey{key.publicKey(), [&](std::string_view) {
                                             ++signatures;
                                             return std::string(64, '\0');
                                         }};
    const auto result = Connection::connect(options);
    EXPECT_FALSE(result.connection);
    EXPECT_NE(result.text.find("cannot send this signature"), std::string::npos) << result.text;
    EXPECT_EQ(signatures, 5);
}

TEST(BusConnectionWithKey, ComesBackAfterSignaturesThatCannotBeSent) {
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    NatsServer server(keyConfiguration(key));
    ConnectionOptions options = optionsFor(server);
    std::atomic<int> bad{0};
    std::atomic<bool> back{false};
    options.events.reconnected = [&] { back = true; };
    options.credentials =
        fleet::UserKey{key.publicKey(), [&](std::string_view nonce) {
                           return bad-- > 0 ? std::string(64, '\0') : key.sign(nonce);
                       }};
    const auto connection = connected(options);
    bad = 5;
    server.kill();
    server.start();
    EXPECT_TRUE(eventually([&] { return back.load(); }));
    EXPECT_GE(connection->unsendableSignatures(), 5U);
}

TEST(BusConnectionWithKey, TellsWhatASignerThrows) {
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    const NatsServer server(keyConfiguration(key));
    ConnectionOptions options = optionsFor(server);
    options.credentials = fleet::UserKey{key.publicKey(), [](std::string_view) -> std::string {
                                             throw std::runtime_error("the key file is gone");
                                         }};
    const auto result = Connection::connect(options);
    EXPECT_FALSE(result.connection);
    EXPECT_NE(result.text.find("the key file is gone"), std::string::npos) << result.text;
}
