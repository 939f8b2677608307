// The list of users who run agents: while it is damaged, the home's owner starts nothing.
#include <gmock/gmock.h>
#include <sys/utsname.h>

#include <string>
#include <vector>

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
std::string agentWith(const std::string& productCode, const std::string& instances = kInstance) {
    return "<agent><productCode>" + productCode + "</productCode>" + instances + "</agent>";
}

const std::string kAgent = agentWith("ux");

struct Overlooked {
    std::string list;  ///< what is in the root
    std::string reason;
};

const std::vector<Overlooked> kOverlooked = {
    {kAgent + agentWith("lz") + agentWith(" ux\n"), "more than one agent with the productCode ux"},
    {agentWith("ux</productCode><productCode>lz"), "an agent with more than one productCode"},
    {agentWith(""), "an empty productCode"},
    {agentWith(" \n"), "an empty productCode"},
    {"<agent><productCode/>" + kInstance + "</agent>", "an empty productCode"},
    {agentWith("UX"), "not lower-case letters and digits"},
    {agentWith("u x"), "not lower-case letters and digits"},
    {agentWith("u&amp;x"), "not lower-case letters and digits"},
    {"<Agent><productCode>ux</productCode>" + kInstance + "</Agent>", "something like <agent>"},
    {"<agents>" + kAgent + "</agents>", "something like <agent>"},
    {kInstance, "something like <instance>"},
    {"<productCode>ux</productCode>", "something like <productCode>"},
    {agentWith("ux", "<Instance><name>a</name><user>m</user></Instance>"),
     "something like <instance>"},
    {agentWith("ux", "<all>" + kInstance + "</all>"), "something like <instance>"},
    {agentWith("ux", "<name>a</name><user>m</user>"), "something like <name>"},
    {agentWith("ux", "<instance><name>a</name><User>x</User><user>m</user></instance>"),
     "something like <user>"},
    {agentWith("ux", kInstance + kInstance), "more than one instance of the same name"},
    {agentWith("ux", kInstance + "<instance><name> a\n</name><user>m</user></instance>"),
     "more than one instance of the same name"},
    {agentWith("ux",
               "<instance><name>a&amp;&lt;</name><user>m</user></instance>"
               "<instance><name> a&amp;&lt;</name><user>m</user></instance>"),
     "more than one instance of the same name"},
    {agentWith("ux", "<instance><name>b</name><name>a</name><user>m</user></instance>"),
     "an instance with more than one name or user"},
    {agentWith("ux", "<instance><name>a</name><user/><user>m</user></instance>"),
     "an instance with more than one name or user"},
    {agentWith("u<x/>x"), "elements in a productCode"},
    {"<agent>u<productCode>x</productCode></agent>", "a text between its entries"},
    {"for&lt;" + kAgent, "a text between its entries"},
    {"&lt;" + kAgent, "a text between its entries"},
};

TEST_F(RunAsList, WholeListsAreAccepted) {
    accepted("<runas>\n</runas>\n");
    accepted("<runas/>");
    accepted("<runas>" + kAgent + agentWith("\n u2 ") + "</runas>");
    accepted("<runas>" + agentWith("ux", kInstance + "<instance><name>b</name><user/></instance>") +
             "</runas>");
    accepted(
        "<list><agent><note><name/><user>x</user></note><productCode>ux</productCode></agent>"
        "</list>");
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
    for (const auto& [list, reason] : kOverlooked)
        refused("<runas>" + list + "</runas>", reason);
    refused(kAgent, "something like <agent>");
    refused("<Agent></Agent>", "something like <agent>");
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
