// zavctl depot: what the depot holds and how it is removed, on a real host.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>

#include "e2e/transfers/push_fixture.h"
#include "host/raw_client.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;
using testing::MatchesRegex;

class DepotVerbs : public PushFixture {
protected:
    DepotVerbs() {
        files_.write("depot/ux/7.1/a", "12345");
        files_.write("depot/b", "");
        files_.write("secret", "outside");
        EXPECT_EQ(::symlink("../secret", files_.path("depot/escape").c_str()), 0);
        start({}, "depot", ManagedHost::Guards::On);
    }
    static bool answered(const RawClient& client) {
        pollfd entry{client.descriptor(), POLLIN, 0};
        return ::poll(&entry, 1, 0) > 0;
    }
    ProgramResult depotVerb(std::vector<std::string> words) const {
        words.insert(words.begin(), "depot");
        return host_->zavctl(words);
    }
};

TEST_F(DepotVerbs, ListTheDepot) {
    EXPECT_EQ(depotVerb({"ls"}).out, "b\nescape\nux/\n");
    EXPECT_EQ(depotVerb({"ls", "/ux/7.1"}).out, "a\n");
    EXPECT_EQ(depotVerb({"ls", "ux\\7.1\\a"}).out, "a\n");
    const std::string time = "[-0-9: ]+, [0-9]+ s ago";
    EXPECT_THAT(depotVerb({"ls", "-l", "ux/7.1"}).out,
                MatchesRegex("TYPE +BYTES +MODIFIED +NAME *\nfile +5 +" + time + " +a *\n"));
}

TEST_F(DepotVerbs, ListTheDepotAsJson) {
    const json listing = json::parse(host_->zavctl({"--json", "depot", "ls", "ux"}).out);
    EXPECT_EQ(listing["type"], "directory");
    EXPECT_EQ(listing["complete"], true);
    EXPECT_EQ(listing["entries"][0]["name"], "7.1");
}

TEST_F(DepotVerbs, SayWhatIsNotThere) {
    const ProgramResult result = depotVerb({"ls", "none"});
    EXPECT_EQ(result.status, 2);
    EXPECT_THAT(result.err, HasSubstr("the depot holds no none"));
}

TEST_F(DepotVerbs, EndAlikeForTheSamePath) {
    for (const char* path : {"none", "../secret"}) {
        EXPECT_EQ(depotVerb({"ls", path}).status, 2) << path;
        EXPECT_EQ(depotVerb({"rm", path}).status, 2) << path;
    }
}

TEST_F(DepotVerbs, NeverLeaveTheDepot) {
    EXPECT_THAT(depotVerb({"ls", "../"}).err, HasSubstr("leads out of the depot"));
    EXPECT_THAT(depotVerb({"sum", "escape"}).err, HasSubstr("escape leads out of the depot"));
    EXPECT_THAT(depotVerb({"rm", "-r", "ux/../../secret"}).err,
                HasSubstr("leads out of the depot"));
    EXPECT_TRUE(files_.exists("secret"));
}

TEST_F(DepotVerbs, PrintChecksums) {
    const ProgramResult result = depotVerb({"sum", "ux/7.1/a", "none", "b"});
    EXPECT_EQ(result.out,
              "5994471abb01112afcc18159f6cc74b4f511b99806da59b3caf5a9c173cacfc5  ux/7.1/a\n"
              "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855  b\n");
    EXPECT_EQ(result.err, "zavctl: the depot holds no none\n");
    EXPECT_EQ(result.status, 1);
}

TEST_F(DepotVerbs, ChecksumsOfLargeFilesHoldNobodyElseUp) {
    files_.write("depot/large", "");
    ASSERT_EQ(::truncate(files_.path("depot/large").c_str(), off_t{1} << 38), 0);
    std::vector<RawClient> clients;
    for (int i = 0; i < 150; ++i) {
        clients.emplace_back(host_->socket());
        ASSERT_TRUE(
            clients.back().send("GET /v1/depot/sum?path=large&path=large HTTP/1.1\r\n\r\n"));
    }
    EXPECT_TRUE(eventually([&] {
        return std::count_if(clients.begin(), clients.end(), answered) == 150 - 2 - 128;
    })) << "two are at work and 128 wait";
    const auto waiting = std::find_if_not(clients.begin(), clients.end(), answered);
    const RawClient::Answer refused =
        std::find_if(clients.begin(), clients.end(), answered)->readAnswer();
    EXPECT_EQ(refused.status, 503);
    EXPECT_THAT(refused.head, HasSubstr("Retry-After: "));
    RawClient other(host_->socket());
    EXPECT_EQ(other.get("/v1/depot?path=ux").status, 200);
    EXPECT_EQ(other.post("/v1/query", R"({"table":"KINAGT"})").status, 200);
    EXPECT_EQ(host_->stop().status, 0) << "and not the end of the host";
    EXPECT_EQ(waiting->readAnswer().status, 503);
}

TEST_F(DepotVerbs, ManyChecksumsAtOnceLetOthersHaveTheirTurn) {
    files_.write("depot/m", std::string(8 << 20, 'm'));
    std::string many = "GET /v1/depot/sum?path=m";
    for (int i = 1; i < 1'500; ++i)
        many += "&path=m";
    RawClient first(host_->socket());
    RawClient second(host_->socket());
    for (RawClient* const client : {&first, &second})
        ASSERT_TRUE(client->send(many + " HTTP/1.1\r\n\r\n"));
    RawClient third(host_->socket());
    EXPECT_THAT(third.get("/v1/depot/sum?path=b").body, HasSubstr("\"bytes\":0"));
    for (const RawClient* const client : {&first, &second})
        EXPECT_FALSE(answered(*client)) << "they have as many files before them as ever";
}

TEST_F(DepotVerbs, RemoveFiles) {
    const ProgramResult result = depotVerb({"rm", "none", "b", "escape"});
    EXPECT_EQ(result.status, 2) << "one of them was not there";
    EXPECT_THAT(result.err, HasSubstr("the depot holds no none"));
    EXPECT_EQ(depotVerb({"ls"}).out, "ux/\n");
    EXPECT_TRUE(files_.exists("secret"));
}

TEST_F(DepotVerbs, RemoveFoldersWhenAskedTo) {
    EXPECT_THAT(depotVerb({"rm", "ux"}).err, HasSubstr("ux is a directory"));
    EXPECT_TRUE(inDepot("ux/7.1/a"));
    EXPECT_EQ(depotVerb({"rm", "-r", "ux"}).status, 0);
    EXPECT_FALSE(inDepot("ux"));
    EXPECT_NE(depotVerb({"rm", "-r", "/"}).status, 0);
    EXPECT_TRUE(inDepot("b"));
}

}  // namespace
