// The list of users who run agents: while it is damaged, the home's owner starts nothing.
#include <gmock/gmock.h>
#include <sys/utsname.h>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

class RunAsList : public PreparedHomeTest {
protected:
    void SetUp() override {
        PreparedHomeTest::SetUp();
        addAgent("tt", "exec sleep 600\n");
        struct utsname names {};
        ::uname(&names);
        const std::string node = names.nodename;
        list_ = "config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg";
    }
    void refused(const std::string& text, const std::string& reason) {
        write(list_, text);
        const Outcome start = agent({"start", "tt"});
        EXPECT_EQ(start.status, 23) << text;
        EXPECT_THAT(start.err, HasSubstr(reason)) << text;
        EXPECT_FALSE(exists("run/tt.pid"));
    }
    void accepted(const std::string& text) {
        write(list_, text);
        const Outcome start = agent({"start", "tt"});
        EXPECT_EQ(start.status, 0) << text << start.err;
        agent({"stop", "tt"});
    }
    std::string list_;
};

const std::string kInstance = "<instance><name>a</name><user>monitor</user></instance>";
const std::string kAgent = "<agent><productCode>ux</productCode>" + kInstance + "</agent>";

TEST_F(RunAsList, WholeListsAreAccepted) {
    accepted("<runas>\n</runas>\n");
    accepted("<runas/>");
    accepted("<runas>" + kAgent + kAgent + "</runas>");
    accepted("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!-- who < runs > what -->\n<runas >" +
             kAgent + "<!--\n--></runas\n>\n");
    accepted(
        "<runas>\n\t<agent>\n\t\t<productCode>ux</productCode>\n\t\t<instance>\n"
        "\t\t\t<name></name>\n\t\t\t<user>m&amp;m</user>\n\t\t</instance>\n\t</agent>\n</runas>\n");
    accepted("<runas><note>\xc3\xa9<deep/></note></runas>");
}

TEST_F(RunAsList, WithoutAListAgentsStart) {
    std::filesystem::remove(inHome(list_));
    EXPECT_EQ(agent({"start", "tt"}).status, 0);
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

TEST_F(RunAsList, ListThatIsCutIsRefusedWhereverItIsCut) {
    const std::string whole = "<runas>" + kAgent + "</runas>";
    for (std::size_t length = 0; length < whole.size(); length += 7) {
        refused(whole.substr(0, length), "nothing is started");
    }
    refused(whole.substr(0, whole.size() - 1), "a tag that does not end");
}

TEST_F(RunAsList, MalformedListsAreRefused) {
    refused("", "no root element");
    refused("ux monitor\n", "text outside");
    refused("<runas></agent>", "unexpected </agent>");
    refused("<runas><agent></runas></agent>", "unexpected </runas>");
    refused("<runas></runas><runas></runas>", "second root");
    refused("<runas></runas>more", "text outside");
    refused("<runas>a & b</runas>", "unknown entity");
    refused("<runas>&#0;</runas>", "unknown entity");
    refused("<runas>]]></runas>", "]]>");
    refused("<runas><!-- a -- b --></runas>", "-- in a comment");
    refused("<runas><!-- a </runas>", "comment that does not end");
    refused("<runas a=1></runas>", "no valid tag");
    refused("<!DOCTYPE runas><runas></runas>", "no valid tag");
    refused("<runas>\xe9</runas>", "not UTF-8");
    refused("<runas>\x01</runas>", "control characters");
    refused(std::string("<runas>\0</runas>", 16), "control characters");
    refused("<runas>\x02</runas>", "control characters");
}

TEST_F(RunAsList, EntriesThatWouldBeOverlookedAreRefused) {
    refused("<runas><agent>" + kInstance + "</agent></runas>", "without a productCode");
    refused(
        "<runas><agent><productCode>ux</productCode><instance><user>m</user></instance>"
        "</agent></runas>",
        "without a name or a user");
    refused(
        "<runas><agent><productCode>ux</productCode><instance><name>a</name></instance>"
        "</agent></runas>",
        "without a name or a user");
}

TEST_F(RunAsList, WhatIsNoReadableFileIsRefused) {
    std::filesystem::remove(inHome(list_));
    std::filesystem::create_directory(inHome(list_));
    EXPECT_EQ(agent({"start", "tt"}).status, 23);
    std::filesystem::remove(inHome(list_));
    ASSERT_EQ(::mkfifo(inHome(list_).c_str(), 0600), 0);
    EXPECT_EQ(agent({"start", "tt"}).status, 23);
    std::filesystem::remove(inHome(list_));
    std::filesystem::create_symlink("nowhere", inHome(list_));
    EXPECT_EQ(agent({"start", "tt"}).status, 23);
}

TEST_F(RunAsList, DamagedListDoesNotKeepAnAgentFromBeingStopped) {
    ASSERT_EQ(agent({"start", "tt"}).status, 0);
    write(list_, "<runas>");
    EXPECT_EQ(agent({"stop", "tt"}).status, 0);
}

}  // namespace
