// ctest-label: threaded
// Fetching from a real front and a made-up centre behind it.
#include "fleet/link/files/file_source.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <mutex>
#include <nlohmann/json.hpp>
#include <string>
#include <thread>

#include "fleet/bus/messages/session.h"
#include "fleet/bus/trust/checksum.h"
#include "fleet/https/front/tls_front.h"
#include "http/server.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace {

using fleet::FileSource;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::NotFetched;
using fleet::OrderFile;
using fleet::Spool;
using fleet::wallClock;
using nlohmann::json;

/// Opens sessions for one key, and gives away one content in pieces of three bytes.
class MadeUpCentre : public http::Handler {
public:
    MadeUpCentre(std::string key, std::string content)
        : key_(std::move(key)), content_(std::move(content)) {}

    std::variant<http::Answer, http::Job> handle(http::Request request) override {
        const std::lock_guard lock(mutex_);
        if (request.target == "/v1/sessions") return http::Answer(session(request));
        ranges_.push_back(request.range);
        if (request.authorization != "Bearer good") {
            return http::Answer(http::errorReply(401, "no session"));
        }
        if (isClosed_) return http::Answer(http::errorReply(403, "no open order needs it"));
        const std::size_t from = std::stoul(request.range.substr(6));
        return http::Answer(http::Reply{206, content_.substr(from, 3), "application/octet-stream"});
    }
    void prepareForEnd() override {}
    bool quiet() const override { return true; }

    std::vector<std::string> ranges() const {
        const std::lock_guard lock(mutex_);
        return ranges_;
    }
    void close() {
        const std::lock_guard lock(mutex_);
        isClosed_ = true;
    }

private:
    http::Reply session(const http::Request& request) const {
        const fleet::SessionRequest asked = fleet::readSessionRequest(request.body);
        if (asked.key != key_ || asked.fleet != "demo") return http::errorReply(403, "not known");
        return http::jsonReply(200, R"({"session":"good"})");
    }

    const std::string key_;
    const std::string content_;
    mutable std::mutex mutex_;
    bool isClosed_ = false;
    std::vector<std::string> ranges_;
};

class FetchedFile : public testing::Test {
protected:
    FetchedFile()
        : centre_(signing_.publicKey(), "one two three"),
          server_(-1,
                  {[](int) {
                       return http::Peer{0, 0, 0, http::Access::Act, "a test"};
                   },
                   ""},
                  centre_, counts_),
          front_({"127.0.0.1", 0, fleet_.directory().serverFile()},
                 [this](sys::FileDescriptor connection) { server_.adopt(std::move(connection)); }),
          thread_([this] { server_.run(); }) {}
    ~FetchedFile() override {
        server_.end(std::chrono::seconds(1));
        front_.end(std::chrono::seconds(1));
        thread_.join();
    }

    FileSource source(const KeyPair& key) const {
        return FileSource({"demo", "https://localhost:" + std::to_string(front_.port()),
                           fleet_.directory().authority(), key},
                          [this] { return !isEnding_; });
    }
    static OrderFile fileOf(const std::string& content) {
        fleet::Checksum sum;
        sum.add(content);
        return {"ux.tar", sum.hex(), content.size()};
    }

    const KeyPair signing_ = KeyPair::make(KeyKind::User);
    const made_fleet::MadeFleet fleet_{[](fleet::FleetPlan& plan) {
        plan.now = wallClock() - std::chrono::minutes(1);
        plan.until = plan.now + made_fleet::kDay;
        plan.authorityUntil = plan.until;
    }};
    ScratchDir scratch_;
    Spool spool_{scratch_.path("spool"), wallClock()};
    std::atomic<bool> isEnding_{false};
    MadeUpCentre centre_;
    http::ServerCounts counts_;
    http::HttpServer server_;
    fleet::TlsFront front_;
    std::thread thread_;
};

TEST_F(FetchedFile, ComesInPieces) {
    FileSource from = source(signing_);
    const OrderFile file = fileOf("one two three");
    from.fetch(file, spool_);
    EXPECT_TRUE(spool_.has(file.sha256));
    EXPECT_EQ(centre_.ranges(), (std::vector<std::string>{"bytes=0-", "bytes=0-", "bytes=3-",
                                                          "bytes=6-", "bytes=9-", "bytes=12-"}))
        << "the first one had no session";
    from.fetch(file, spool_);
    EXPECT_EQ(centre_.ranges().size(), 6U) << "it is there";
}

TEST_F(FetchedFile, GoesOnWithWhatIsThere) {
    const OrderFile file = fileOf("one two three");
    spool_.append(file.sha256, "one two ");
    source(signing_).fetch(file, spool_);
    EXPECT_TRUE(spool_.has(file.sha256));
    EXPECT_EQ(centre_.ranges().front(), "bytes=8-");
}

TEST_F(FetchedFile, ThatIsAnotherOneIsNotTaken) {
    FileSource from = source(signing_);
    EXPECT_THROW(from.fetch(fileOf("one two tree!"), spool_), NotFetched);
    EXPECT_EQ(spool_.partOf(fileOf("one two tree!").sha256), 0U);
}

TEST_F(FetchedFile, ThatIsLongerOrShorterThanTheOrderSaysIsNotTaken) {
    FileSource from = source(signing_);
    OrderFile file = fileOf("one two three");
    file.size = 14;
    EXPECT_THROW(from.fetch(file, spool_), NotFetched);
    spool_.forget(file.sha256);
    file.size = 2;
    EXPECT_THROW(from.fetch(file, spool_), NotFetched);
}

TEST_F(FetchedFile, IsForHostsOfTheFleetOnly) {
    FileSource from = source(KeyPair::make(KeyKind::User));
    EXPECT_THROW(from.fetch(fileOf("one two three"), spool_), NotFetched);
}

TEST_F(FetchedFile, ThatTheCentreRefusesMayComeLater) {
    centre_.close();
    FileSource from = source(signing_);
    try {
        from.fetch(fileOf("one two three"), spool_);
        FAIL() << "it came";
    } catch (const NotFetched& why) {
        EXPECT_NE(std::string(why.what()).find("no open order needs it"), std::string::npos);
    }
}

TEST_F(FetchedFile, DoesNotComeToALinkThatEndsOrKnowsNoCentre) {
    FileSource nowhere({"demo", "", "", signing_}, [] { return true; });
    EXPECT_THROW(nowhere.fetch(fileOf("one two three"), spool_), NotFetched);
    isEnding_ = true;
    FileSource from = source(signing_);
    EXPECT_THROW(from.fetch(fileOf("one two three"), spool_), NotFetched);
    EXPECT_TRUE(centre_.ranges().empty());
}

}  // namespace
