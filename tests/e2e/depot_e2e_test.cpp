// zavctl depot: what the depot holds and how it is removed, on a real host.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include "e2e/push_fixture.h"

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
    ProgramResult depotVerb(std::vector<std::string> words) const {
        words.insert(words.begin(), "depot");
        return host_->zavctl(words);
    }
};

TEST_F(DepotVerbs, ListTheDepot) {
    EXPECT_EQ(depotVerb({"ls"}).out, "b\nescape\nux/\n");
    EXPECT_EQ(depotVerb({"ls", "/ux/7.1"}).out, "a\n");
    EXPECT_EQ(depotVerb({"ls", "ux\\7.1\\a"}).out, "a\n");
    const std::string time = "[0-9]+-[0-9]+-[0-9]+T[0-9]+:[0-9]+:[0-9]+Z";
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
    EXPECT_NE(result.status, 0);
    EXPECT_THAT(result.err, HasSubstr("the depot holds no none"));
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

TEST_F(DepotVerbs, RemoveFiles) {
    const ProgramResult result = depotVerb({"rm", "none", "b", "escape"});
    EXPECT_EQ(result.status, 1) << "one of them was not there";
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
