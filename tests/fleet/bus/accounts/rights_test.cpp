#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "fleet/bus/accounts/fleet_bus.h"
#include "fleet/bus/nats/pull.h"
#include "fleet/bus/nats/store.h"
#include "support/host/program.h"

using connecting::connected;
using connecting::kPatience;
using fleet::BusMessage;
using fleet::Connection;
using fleet::KeyKind;
using fleet::KeyPair;
using Kind = fleet::BusStatus::Kind;

namespace {

constexpr std::chrono::hours kForever(1);

/// A fleet with streams, a centre that answers, and two hosts.
class RightsOfHosts : public testing::Test {
protected:
    RightsOfHosts() {
        const fleet::StreamLimits limits{1 << 20, 1};
        for (const auto& settings :
             {fleet::tasksStream(limits), fleet::outStream(limits), fleet::hostsStream(limits)}) {
            const auto made = ensureStream(*centre_, settings, kPatience);
            if (!made.status.done()) throw std::runtime_error(made.status.text);
        }
        for (const char* subject : {"hello.*", "ans.*"}) {
            answering_.push_back(centre_
                                     ->subscribe(
                                         subject,
                                         [this](const BusMessage& message) {
                                             centre_->publish(message.reply,
                                                              "to " + message.subject);
                                         },
                                         kPatience)
                                     .subscription);
        }
    }

    std::string own(const std::string& before, const std::string& after = "") const {
        return before + h_.publicKey() + after;
    }
    std::string others(const std::string& before, const std::string& after = "") const {
        return before + g_.publicKey() + after;
    }
    void expectOnlyOwnRights(Connection& host) const;

    FleetBus fleet_;
    const KeyPair h_ = KeyPair::make(KeyKind::User);
    const KeyPair g_ = KeyPair::make(KeyKind::User);
    std::unique_ptr<Connection> centre_ = fleet_.centre();
    std::vector<std::unique_ptr<fleet::Subscription>> answering_;
};

void RightsOfHosts::expectOnlyOwnRights(Connection& host) const {
    const std::string mayNotPublish[] = {others("hello."),
                                         others("ans."),
                                         others("out."),
                                         others("$KV.HOSTS."),
                                         others("$JS.API.DIRECT.GET.TASKS.task.", ".1"),
                                         own("$JS.API.DIRECT.GET.KV_HOSTS.$KV.HOSTS."),
                                         "$JS.API.DIRECT.GET.TASKS",
                                         own("task.", ".1"),
                                         own("rp.task.", ".1"),
                                         own("rp.ask."),
                                         others("rp.ask."),
                                         own("_I.", ".x"),
                                         others("_I.", ".x"),
                                         "hello",
                                         "out",
                                         "out.any",
                                         "$JS.API.INFO",
                                         "$JS.API.STREAM.INFO.TASKS",
                                         "$JS.API.STREAM.NAMES",
                                         "$JS.API.STREAM.CREATE.MINE",
                                         "$JS.API.STREAM.UPDATE.TASKS",
                                         "$JS.API.STREAM.DELETE.TASKS",
                                         "$JS.API.STREAM.PURGE.KV_HOSTS",
                                         "$JS.API.STREAM.MSG.GET.TASKS",
                                         "$JS.API.STREAM.MSG.DELETE.TASKS",
                                         "$JS.API.STREAM.SNAPSHOT.OUT",
                                         "$JS.API.CONSUMER.CREATE.OUT",
                                         "$JS.API.CONSUMER.DURABLE.CREATE.OUT.centre",
                                         "$JS.API.CONSUMER.MSG.NEXT.OUT.centre",
                                         "$JS.API.CONSUMER.DELETE.OUT.centre",
                                         "$JS.ACK.OUT.centre.1.1.1.1.0",
                                         "$KV.CENTRE.lease",
                                         "$SYS.REQ.SERVER.PING",
                                         "$SYS.REQ.CLAIMS.UPDATE",
                                         "$SYS.REQ.USER.INFO"};
    for (const std::string& subject : mayNotPublish) {
        EXPECT_EQ(host.request(subject, "", kForever).status.kind, Kind::Forbidden) << subject;
    }
    const std::string mayNotSubscribe[] = {others("rp.task.", ".*"),
                                           others("rp.task.", ".1"),

                                           "rp.task.>",
                                           "rp.task.*.*",
                                           "rp.task.*.1",
                                           "rp.>",
                                           others("rp.ask."),
                                           "rp.ask.*",
                                           "rp.ask.>",
                                           "rp.*.*",
                                           others("_I.", ".>"),
                                           "_I.>",
                                           "_I.*.>",
                                           "_I.*.x",
                                           "*",
                                           ">",
                                           "*.*",
                                           "hello.*",
                                           own("hello."),
                                           "ans.*",
                                           "out.*",
                                           "task.>",
                                           own("task.", ".*"),
                                           "$KV.HOSTS.*",
                                           "$JS.>",
                                           "$JS.API.>",
                                           "$SYS.>",
                                           "_INBOX.>"};
    for (const std::string& subject : mayNotSubscribe) {
        const auto subscribed = host.subscribe(
            subject, [](const BusMessage&) {}, kPatience);
        EXPECT_EQ(subscribed.status.kind, Kind::Forbidden) << subject;
    }
}

}  // namespace

TEST_F(RightsOfHosts, LetAHostSayHelloAndAnswer) {
    const auto host = connected(fleet_.hostOptions(h_));
    for (const std::string& subject : {own("hello."), own("ans.")}) {
        const auto reply = host->request(subject, "", kPatience);
        ASSERT_TRUE(reply.status.done()) << reply.status.text;
        EXPECT_EQ(reply.message.data, "to " + subject);
    }
}

TEST_F(RightsOfHosts, LetAHostStoreItsOutcomesAndFacts) {
    const auto host = connected(fleet_.hostOptions(h_));
    for (const std::string& subject : {own("out."), own("$KV.HOSTS.")}) {
        const auto stored = store(*host, subject, "x", kPatience);
        EXPECT_EQ(stored.kind, fleet::StoreResult::Kind::Stored) << stored.text;
    }
    EXPECT_EQ(lastOn(*centre_, "KV_HOSTS", own("$KV.HOSTS."), kPatience).bytes, "x");
}

TEST_F(RightsOfHosts, LetAHostGetItsOwnTasks) {
    const auto host = connected(fleet_.hostOptions(h_));
    ASSERT_EQ(storeFirst(*centre_, own("task.", ".1"), "one", kPatience).kind,
              fleet::StoreResult::Kind::Stored);
    EXPECT_EQ(lastOn(*host, "TASKS", own("task.", ".1"), kPatience).bytes, "one");
    EXPECT_EQ(lastOn(*host, "TASKS", own("task.", ".2"), kPatience).kind,
              fleet::LastResult::Kind::Missing);
    EXPECT_EQ(lastOn(*host, "TASKS", others("task.", ".1"), kForever).kind,
              fleet::LastResult::Kind::Forbidden);
}

TEST_F(RightsOfHosts, GiveAHostWhatIsPublishedToItAndToNobodyElse) {
    const auto host = connected(fleet_.hostOptions(h_));
    std::mutex mutex;
    std::multiset<std::string> heard;  // two subscriptions have no order between them
    const auto hear = [&](const BusMessage& message) {
        const std::lock_guard lock(mutex);
        heard.insert(message.subject);
    };
    const auto tasks = host->subscribe(own("rp.task.", ".*"), hear, kPatience);
    const auto questions = host->subscribe(own("rp.ask."), hear, kPatience);
    ASSERT_TRUE(tasks.status.done()) << tasks.status.text;
    ASSERT_TRUE(questions.status.done()) << questions.status.text;
    storeFirst(*centre_, others("task.", ".1"), "not for it", kPatience);
    centre_->publish(others("rp.ask."), "not for it");
    storeFirst(*centre_, own("task.", ".1"), "one", kPatience);
    centre_->publish(own("rp.ask."), "a question");
    ASSERT_TRUE(eventually([&] {
        const std::lock_guard lock(mutex);
        return heard.size() >= 2;
    }));
    const std::lock_guard lock(mutex);
    EXPECT_EQ(heard, (std::multiset<std::string>{own("rp.task.", ".1"), own("rp.ask.")}));
}

TEST_F(RightsOfHosts, EndAtItsOwnSubjects) {
    const auto host = connected(fleet_.hostOptions(h_));
    expectOnlyOwnRights(*host);
}

TEST_F(RightsOfHosts, AreNotWidenedByAName) {
    for (const std::string& name : {std::string("*"), std::string(">"), std::string("a.b"),
                                    g_.publicKey(), std::string("{{subject()}}")}) {
        SCOPED_TRACE(name);
        const auto host = connected(fleet_.hostOptions(h_, name));
        EXPECT_TRUE(host->request(own("hello."), "", kPatience).status.done());
        EXPECT_EQ(host->request(others("hello."), "", kForever).status.kind, Kind::Forbidden);
        EXPECT_EQ(host->request("hello.any", "", kForever).status.kind, Kind::Forbidden);
        EXPECT_EQ(host->subscribe(
                          "rp.task.>", [](const BusMessage&) {}, kPatience)
                      .status.kind,
                  Kind::Forbidden);
    }
}

TEST_F(RightsOfHosts, CannotBeGivenToWhatIsNoKey) {
    for (const std::string& key : {std::string("*"), std::string(">"), std::string("a.b"),
                                   std::string(), fleet_.keys().hosts.publicKey()}) {
        EXPECT_THROW(fleet::hostUserToken(fleet_.keys().hostSigner, fleet_.keys().hosts.publicKey(),
                                          {key, "a host", fleet_.madeAt(), {}}),
                     std::invalid_argument)
            << key;
        EXPECT_THROW(
            fleet::fullUserToken(fleet_.keys().control, {key, "a centre", fleet_.madeAt(), {}}),
            std::invalid_argument)
            << key;
    }
}

TEST_F(RightsOfHosts, CannotBeWidenedByWhoSignsHosts) {
    const fleet::TokenHead head{h_.publicKey(), "a host", fleet_.madeAt(), {}};
    const std::string account = fleet_.keys().hosts.publicKey();
    const std::string wider = R"({"type": "user", "version": 2, "issuer_account": ")" + account +
                              R"(", "pub": {"allow": [">"]}, "sub": {"allow": [">"]}})";
    const auto token = fleet::signedToken(head, wider, fleet_.keys().hostSigner);
    EXPECT_EQ(Connection::connect(fleet_.optionsOf(h_, token)).failure,
              Connection::Result::Failure::Refused);
    // Nor can it make somebody in the centre's account.
    const auto elsewhere =
        fleet::hostUserToken(fleet_.keys().hostSigner, fleet_.keys().control.publicKey(), head);
    EXPECT_EQ(Connection::connect(fleet_.optionsOf(h_, elsewhere)).failure,
              Connection::Result::Failure::Refused);
}

TEST_F(RightsOfHosts, BelongToWhoHasTheKey) {
    const std::string token = fleet_.hostToken(h_);
    EXPECT_EQ(Connection::connect(fleet_.optionsOf(g_, token)).failure,
              Connection::Result::Failure::Refused)
        << "somebody else's token";
    const auto own =
        fleet::hostUserToken(KeyPair::make(KeyKind::Account), fleet_.keys().hosts.publicKey(),
                             {h_.publicKey(), "a host", fleet_.madeAt(), {}});
    EXPECT_EQ(Connection::connect(fleet_.optionsOf(h_, own)).failure,
              Connection::Result::Failure::Refused)
        << "a token of somebody's own making";
}

TEST_F(RightsOfHosts, EndWhenTheTokenDoes) {
    const auto token = fleet::hostUserToken(
        fleet_.keys().hostSigner, fleet_.keys().hosts.publicKey(),
        {h_.publicKey(), "a host", fleet_.madeAt(), FleetBus::now() - std::chrono::seconds(1)});
    EXPECT_EQ(Connection::connect(fleet_.optionsOf(h_, token)).failure,
              Connection::Result::Failure::Refused);
}

TEST_F(RightsOfHosts, DoNotReachTheStoreByTheSubjectForTheAnswer) {
    const auto host = connected(fleet_.hostOptions(h_));
    for (const std::string& subject : {own("out."), own("$KV.HOSTS."), own("hello.")}) {
        for (const char* reply : {"$JS.API.STREAM.DELETE.TASKS", "$JS.API.STREAM.PURGE.OUT"}) {
            ASSERT_TRUE(host->publishAsking(subject, reply, "").done());
        }
    }
    ASSERT_TRUE(host->flush(kPatience).done());
    EXPECT_TRUE(host->request(own("hello."), "", kPatience).status.done()) << "all has been read";
    for (const auto& settings :
         {fleet::tasksStream({1 << 20, 1}), fleet::outStream({1 << 20, 1})}) {
        const auto there = ensureStream(*centre_, settings, kPatience);
        EXPECT_TRUE(there.status.done());
        EXPECT_FALSE(there.made) << settings.name;
    }
    auto pull = fleet::Pull::open(*centre_, {"OUT", "centre"}, kPatience).pull;
    ASSERT_TRUE(pull);
    EXPECT_EQ(pull->fetch(10, std::chrono::seconds(0), kPatience).messages.size(), 2U);
}

TEST_F(RightsOfHosts, DoNotLetAHostDropTheFactsOfOthers) {
    const auto host = connected(fleet_.hostOptions(h_));
    store(*centre_, others("$KV.HOSTS."), "theirs", kPatience);
    for (const char* what : {"all", "sub"}) {
        host->request(own("$KV.HOSTS."), "mine", kPatience, {{"Nats-Rollup", what}});
    }
    EXPECT_EQ(lastOn(*centre_, "KV_HOSTS", others("$KV.HOSTS."), kPatience).bytes, "theirs");
}
