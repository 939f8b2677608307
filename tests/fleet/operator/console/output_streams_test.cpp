// ctest-label: threaded

// The output of a host's task on its way through the console, with a centre and a host whose every
// word is written by the test.
#include "fleet/operator/console/outputs/output_streams.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <deque>
#include <memory>
#include <mutex>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "ctl/console/served_console.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/output_news.h"
#include "fleet/bus/messages/question.h"
#include "fleet/bus/trust/sealed.h"
#include "fleet/operator/console/fleet_backend.h"
#include "support/host/program.h"
#include "tests/fleet/https/tls_server.h"
#include "tests/fleet/operator/certified.h"

namespace {

using console_test::ServedConsole;
using fleet::KeyPair;
using fleet::OutputNews;
using fleet_test::TlsPeer;
using fleet_test::TlsServer;
using nlohmann::json;
using operator_test::kHour;
using operator_test::newUser;

OutputNews at(const std::string& position, std::vector<fleet::OutputText> texts = {}) {
    OutputNews news;
    news.at = position;
    news.texts = std::move(texts);
    return news;
}

OutputNews over() {
    OutputNews news;
    news.isOver = true;
    return news;
}

OutputNews error(const std::string& why, fleet::Number status) {
    OutputNews news;
    news.error = why;
    news.status = status;
    return news;
}

/// A centre with one host, which shows what the test has it show.
class ShownHost {
public:
    explicit ShownHost(const fleet::ServerCertificate& certificate)
        : server_(certificate, [this](TlsServer& self) { serve(self); }) {}
    ~ShownHost() {
        isStopping_ = true;
        server_.stop();
        server_.join();
    }
    ShownHost(const ShownHost&) = delete;
    ShownHost& operator=(const ShownHost&) = delete;

    std::string url() const { return server_.url(); }
    /// The next piece of its answer.
    void show(OutputNews news) {
        const std::lock_guard lock(mutex_);
        news_.push_back(std::move(news));
    }
    /// What it is asked, in the bytes that the operator has signed.
    std::vector<std::string> asked() const {
        const std::lock_guard lock(mutex_);
        return asked_;
    }
    /// How many connections the console has.
    int open() const { return open_; }
    void refuseNow(int status) {
        const std::lock_guard lock(mutex_);
        refusal_ = status;
    }
    void setState(const std::string& state) {
        const std::lock_guard lock(mutex_);
        state_ = state;
    }

private:
    void serve(TlsServer& self) {
        std::vector<std::thread> peers;
        while (!isStopping_) {
            TlsPeer accepted = self.accept();
            if (!accepted.isOpen()) continue;
            ++open_;
            peers.emplace_back([this, peer = std::move(accepted)]() mutable {
                for (std::string request = peer.request(); !request.empty();
                     request = peer.request()) {
                    const auto [status, body] = answerTo(request);
                    peer.answer(status, body.dump());
                }
                --open_;
            });
        }
        for (std::thread& peer : peers)
            peer.join();
    }
    std::pair<int, json> answerTo(const std::string& request) {
        const std::lock_guard lock(mutex_);
        const std::string question = request.substr(0, request.find(" HTTP/1.1"));
        const std::string body = request.substr(request.find("\r\n\r\n") + 4);
        if (question == "POST /v1/sessions") return {200, {{"session", "s1"}}};
        if (refusal_ != 0) return {refusal_, {{"error", "not yet"}}};
        if (question == "GET /v1/hosts/web-1") {
            return {200,
                    {{"host", key_},
                     {"name", "web-1"},
                     {"state", state_},
                     {"signing", signing_.publicKey()}}};
        }
        if (question == "POST /v1/questions") {
            const json questions = json::parse(body).at("questions");
            asked_.push_back(fleet::bytesOfBase64(questions.at(0).get<std::string>()));
            return {200, {{"round", "r1"}}};
        }
        if (question == "GET /v1/questions/r1") return {200, {{"answers", answers()}}};
        return {404, {{"error", "there is no such host"}}};
    }
    json answers() {
        json answers = json::array();
        const fleet::Order latest = fleet::readOrder(asked_.back()).order;
        for (; !news_.empty(); news_.pop_front()) {
            OutputNews& news = news_.front();
            news.stream = fleet::readOrder(asked_.front()).order.id;
            const std::string to = json::parse(latest.body).at("answerTo");
            const std::string piece = signAnswer(
                {key_, latest.id, place_++, news.isOver, fleet::sealFor(to, textOfNews(news))},
                signing_);
            answers.push_back({{"host", key_}, {"signed", fleet::base64Of(piece)}});
        }
        return answers;
    }

    const KeyPair signing_ = newUser();
    const std::string key_ = newUser().publicKey();
    mutable std::mutex mutex_;
    std::deque<OutputNews> news_;
    std::vector<std::string> asked_;
    std::string state_ = "here";
    int refusal_ = 0;
    fleet::Number place_ = 0;
    std::atomic<int> open_{0};
    std::atomic<bool> isStopping_{false};
    TlsServer server_;
};

class OutputOfAHost : public testing::Test {
protected:
    explicit OutputOfAHost(const std::vector<std::string>& commands = {"OUTPUT"})
        : identity_(root_.certified(commands, {}, "*", now_ + kHour)) {
        identity_.url = host_.url();
        identity_.authority = authority_.certificate();
        serve();
    }
    void serve() {
        fleet::FleetBackend::Settings settings{identity_};
        settings.outputTime = std::chrono::minutes(1);  // a busy machine is no centre that is away
        served_.emplace(std::make_unique<fleet::FleetBackend>(std::move(settings)));
        served_->open();
    }
    RawClient ask(const std::string& lines = "",
                  const std::string& query = "?host=web-1&task=deploy-7") const {
        RawClient client = served_->connect();
        client.send(served_->get("/console/output" + query,
                                 served_->cookie() + "X-Zav-Console: 1\r\n" + lines));
        return client;
    }
    std::string errorIn(const RawClient::Answer& answer) const {
        return json::parse(answer.body).value("error", "");
    }

    const operator_test::Root root_;
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + kHour);
    ShownHost host_{authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kHour)};
    fleet::OperatorIdentity identity_;
    std::optional<ServedConsole> served_;
};

TEST_F(OutputOfAHost, IsAStreamAsTheHostItselfHasIt) {
    host_.show(at("1-0-0"));
    RawClient client = ask();
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_EQ(head.substr(0, 12), "HTTP/1.1 200");
    EXPECT_NE(head.find("Content-Type: text/event-stream\r\n"), std::string::npos) << head;
    EXPECT_NE(head.find("Last-Event-ID: 1-0-0\r\n"), std::string::npos) << head;
    OutputNews news = at("1-2-0", {{false, "one\n"}, {true, "two\n"}});
    news.lost = 7;
    host_.show(std::move(news));
    EXPECT_EQ(client.readUntil("\n\n"), "event: overflow\ndata: {\"lost\":7}\n\n");
    EXPECT_EQ(client.readUntil("\n\n"), "data: {\"stream\":\"stdout\",\"text\":\"one\\n\"}\n\n");
    EXPECT_EQ(client.readUntil("\n\n"),
              "id: 1-2-0\ndata: {\"stream\":\"stderr\",\"text\":\"two\\n\"}\n\n");
    host_.show(over());
    EXPECT_EQ(client.readUntil("\n\n"), "event: end\ndata: {}\n\n");
    EXPECT_TRUE(client.isClosed());
}

TEST_F(OutputOfAHost, IsAskedForWithTheOperatorsSignature) {
    host_.show(over());
    ask().readAll();
    const auto asked = host_.asked();
    ASSERT_EQ(asked.size(), 1U);
    const fleet::SignedOrder question = fleet::readOrder(asked[0]);
    EXPECT_TRUE(isQuestionSignedBy(question, identity_.key.publicKey()));
    EXPECT_EQ(question.order.kind, "OUTPUT");
    const json body = json::parse(question.order.body);
    EXPECT_EQ(body.at("task"), "deploy-7");
    EXPECT_EQ(body.at("follow"), true);
    EXPECT_FALSE(body.contains("after"));
}

TEST_F(OutputOfAHost, GoesOnBehindWhatThePageHasSeen) {
    OutputNews news = at("1-3-0", {{false, "three\n"}});
    news.after = "1-2-0";
    host_.show(std::move(news));
    RawClient client = ask("Last-Event-ID: 1-2-0\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_NE(head.find("Last-Event-ID: 1-2-0\r\n"), std::string::npos)
        << "who gets the head only goes on there: " << head;
    EXPECT_EQ(client.readUntil("\n\n"),
              "id: 1-3-0\ndata: {\"stream\":\"stdout\",\"text\":\"three\\n\"}\n\n");
    EXPECT_EQ(json::parse(fleet::readOrder(host_.asked().at(0)).order.body).at("after"), "1-2-0");
}

TEST_F(OutputOfAHost, ThatIsRefusedIsRefusedInTheWordsOfTheHost) {
    host_.show(error("there is no task \"deploy-7\"", ctl::kWrongUsage));
    const auto answer = ask().readAnswer();
    EXPECT_EQ(answer.status, 400);
    EXPECT_EQ(errorIn(answer), "web-1: there is no task \"deploy-7\"");
}

TEST_F(OutputOfAHost, ThatIsAwayIsNotAskedFor) {
    host_.setState("away");
    const auto answer = ask().readAnswer();
    EXPECT_EQ(answer.status, 502);
    EXPECT_EQ(errorIn(answer), "web-1 is away");
    EXPECT_TRUE(host_.asked().empty());
}

TEST_F(OutputOfAHost, ThatNobodyKnowsIsRefusedInTheWordsOfTheCentre) {
    const auto answer = ask("", "?host=web-2&task=deploy-7").readAnswer();
    EXPECT_EQ(answer.status, 400);
    EXPECT_NE(errorIn(answer).find("there is no such host"), std::string::npos) << answer.body;
}

TEST_F(OutputOfAHost, IsAskedForAgainWhenTheCentreCannotAnswerNow) {
    host_.refuseNow(503);
    const auto answer = ask().readAnswer();
    EXPECT_EQ(answer.status, 502) << "the page takes no other refusal for one that passes";
    EXPECT_NE(errorIn(answer).find("not yet"), std::string::npos) << answer.body;
}

TEST_F(OutputOfAHost, EndsWhatTheHostStillShowsWhenItIsAskedForAgain) {
    std::set<std::string> readers;
    for (int i = 0; i < 6; ++i) {
        host_.show(over());
        ask().readAll();
        readers.insert(json::parse(fleet::readOrder(host_.asked().back()).order.body)["answerTo"]);
        EXPECT_TRUE(eventually([&] { return host_.open() == 0; }));
    }
    EXPECT_LT(readers.size(), 6U) << "the host knows who has come back";
}

TEST_F(OutputOfAHost, ThatBreaksOffSaysWhy) {
    host_.show(at("1-0-0"));
    RawClient client = ask();
    client.readUntil("\r\n\r\n");
    host_.show(error("the host went away", ctl::kNoHost));
    EXPECT_EQ(client.readUntil("\n\n"),
              "event: break\ndata: {\"error\":\"web-1: the host went away\"}\n\n");
    EXPECT_TRUE(client.isClosed());
}

TEST_F(OutputOfAHost, PutsNothingIntoTheHeadThatIsNoPosition) {
    host_.show(at("1-0-0\r\nSet-Cookie: a=b"));
    host_.show(at("1\nevent: end", {{false, "text"}}));
    host_.show(over());
    const std::string all = ask().readAll();
    EXPECT_EQ(all.find("Set-Cookie"), std::string::npos) << all;
    EXPECT_EQ(all.find("Last-Event-ID"), std::string::npos) << all;
    EXPECT_EQ(all.substr(all.find("\r\n\r\n") + 4),
              "data: {\"stream\":\"stdout\",\"text\":\"text\"}\n\nevent: end\ndata: {}\n\n");
}

TEST_F(OutputOfAHost, EndsAtTheCentreWhenItsBrowserGoes) {
    host_.show(at("1-0-0"));
    {
        RawClient client = ask();
        client.readUntil("\r\n\r\n");
    }
    EXPECT_TRUE(eventually([&] { return host_.open() == 0; }));
}

TEST_F(OutputOfAHost, EndsWhenItsBrowserGoesBeforeTheHostHasBegun) {
    {
        RawClient client = ask();
        ASSERT_TRUE(eventually([&] { return host_.asked().size() == 1; }));
    }
    EXPECT_TRUE(eventually([&] { return host_.open() == 0; }));
}

TEST_F(OutputOfAHost, EndsWithTheConsole) {
    host_.show(at("1-0-0"));
    RawClient begun = ask();
    begun.readUntil("\r\n\r\n");
    served_.reset();
    EXPECT_TRUE(begun.isClosed());
    EXPECT_TRUE(eventually([&] { return host_.open() == 0; }));
}

TEST_F(OutputOfAHost, IsShownAFewTimesAtOnce) {
    std::vector<RawClient> clients;
    for (std::size_t i = 0; i < fleet::OutputStreams::kMost; ++i)
        clients.push_back(ask());
    ASSERT_TRUE(eventually([&] { return host_.asked().size() == fleet::OutputStreams::kMost; }));
    EXPECT_EQ(ask().readAnswer().status, 429);
    clients.clear();
    EXPECT_TRUE(eventually([&] {
        RawClient next = ask("", "?host=web-2&task=x");
        return next.readAnswer().status == 400;
    })) << "those that nobody wants make room";
}

TEST_F(OutputOfAHost, IsAskedForByAHostAndATask) {
    for (const char* query :
         {"", "?host=web-1", "?task=x", "?host=&task=x", "?host=web-1&task=x&task=y",
          "?host=web-1&task=x&follow=1", "?host=web-1&task=a%0Ab", "?host=web-1&task=%zz"}) {
        EXPECT_EQ(ask("", query).readAnswer().status, 400) << query;
    }
    const std::string longest(300, 'x');
    EXPECT_EQ(ask("", "?host=web-1&task=" + longest).readAnswer().status, 400);
    EXPECT_EQ(ask("Last-Event-ID: 1 2\r\n").readAnswer().status, 400);
    EXPECT_EQ(ask("Last-Event-ID: " + longest + "\r\n").readAnswer().status, 400);
    EXPECT_EQ(served_->ask(served_->send("POST", "/console/output?host=web-1&task=x", "")).status,
              405);
    EXPECT_EQ(served_->ask(served_->get("/console/output?host=web-1&task=x")).status, 401);
    EXPECT_EQ(
        served_->ask(served_->get("/console/output?host=web-1&task=x", served_->cookie())).status,
        403)
        << "another page of this machine may have the cookie sent along";
    EXPECT_TRUE(host_.asked().empty());
}

class OutputForOthers : public OutputOfAHost {
protected:
    OutputForOthers() : OutputOfAHost({"START", "TASKS"}) {}
};

TEST_F(OutputForOthers, IsNotAskedFor) {
    const auto answer = ask().readAnswer();
    EXPECT_EQ(answer.status, 409);
    EXPECT_EQ(errorIn(answer), "your certificate does not allow OUTPUT");
    EXPECT_TRUE(host_.asked().empty());
}

}  // namespace
