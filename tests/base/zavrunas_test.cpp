// The run-as database.
#include "base/zavrunas.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include <memory>
#include <string>

#include "support/scratch_dir.h"
#include "support/trace_capture.h"

using namespace ZAV;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

constexpr const char* kFile =
    "<runas>\n"
    "\t<agent>\n"
    "\t\t<productCode>ux</productCode>\n"
    "\t\t<instance>\n"
    "\t\t\t<name>main</name>\n"
    "\t\t\t<user>monitor</user>\n"
    "\t\t</instance>\n"
    "\t\t<instance>\n"
    "\t\t\t<name>spare</name>\n"
    "\t\t\t<user></user>\n"
    "\t\t</instance>\n"
    "\t</agent>\n"
    "\t<agent>\n"
    "\t\t<productCode>lz</productCode>\n"
    "\t</agent>\n"
    "</runas>\n";

std::string narrow(const String& text) {
    return static_cast<const char*>(text.c_str());
}

class RunAs : public ::testing::Test {
protected:
    String path() const { return String(scratch.path("runas.cfg").c_str()); }
    std::unique_ptr<StartupDB> load(const std::string& content) const {
        scratch.write("runas.cfg", content);
        return std::make_unique<StartupDB>(path());
    }
    static std::string userOf(const StartupDB& db, const char* product, const char* instance) {
        const AgentEntry* const agent = db.getAgent(product);
        if (agent == nullptr) return "(no agent)";
        const InstanceEntry* const entry = agent->getInstance(instance);
        return entry == nullptr ? "(no instance)" : narrow(entry->getUser());
    }

    ScratchDir scratch;
    TraceCapture traces;
};

TEST_F(RunAs, FindsTheUserOfAnInstance) {
    const auto db = load(kFile);
    EXPECT_EQ(db->getNumAgents(), 2u);
    EXPECT_EQ(userOf(*db, "ux", "main"), "monitor");
    EXPECT_EQ(userOf(*db, "ux", "spare"), "");
    EXPECT_EQ(userOf(*db, "ux", "other"), "(no instance)");
    EXPECT_EQ(userOf(*db, "lz", "main"), "(no instance)");
    EXPECT_EQ(userOf(*db, "UX", "main"), "(no agent)");
    EXPECT_THAT(traces.details("zavrunas"), ElementsAre("Parsing file: " + narrow(path())));
    EXPECT_THAT(traces.errors(), IsEmpty());
}

TEST_F(RunAs, KeepsTheOrderOfTheFile) {
    const auto db = load(kFile);
    EXPECT_EQ(narrow(db->getAgent(0u)->getProductCode()), "ux");
    EXPECT_EQ(narrow(db->getAgent(1u)->getProductCode()), "lz");
    EXPECT_EQ(db->getAgent(2u), nullptr);
    const AgentEntry& ux = *db->getAgent(0u);
    EXPECT_EQ(ux.getNumInstances(), 2u);
    EXPECT_EQ(narrow(ux.getInstance(0u)->getInstanceName()), "main");
    EXPECT_EQ(narrow(ux.getInstance(1u)->getInstanceName()), "spare");
    EXPECT_EQ(ux.getInstance(2u), nullptr);
}

TEST_F(RunAs, ValuesAreTrimmed) {
    const auto db = load(
        "<r><agent><productCode>\n\t ux \r\n</productCode>"
        "<instance>\n<name> \tmain\n</name>\n\n<user>\n monitor </user></instance></agent></r>");
    EXPECT_EQ(userOf(*db, "ux", "main"), "monitor");
}

TEST_F(RunAs, FirstOfTwoAgentsOrInstancesOfOneNameCounts) {
    const auto db = load(
        "<r><agent><productCode>ux</productCode>"
        "<instance><name>a</name><user>first</user></instance>"
        "<instance><name>a</name><user>second</user></instance></agent>"
        "<agent><productCode>ux</productCode>"
        "<instance><name>b</name><user>third</user></instance></agent></r>");
    EXPECT_EQ(db->getNumAgents(), 2u);
    EXPECT_EQ(userOf(*db, "ux", "a"), "first");
    EXPECT_EQ(userOf(*db, "ux", "b"), "(no instance)");
}

TEST_F(RunAs, FirstOfTwoChildrenOfOneNameCounts) {
    const auto db = load(
        "<r><agent><productCode>ux</productCode><productCode>lz</productCode>"
        "<instance><name>a</name><name>b</name><user>c</user><user>d</user></instance>"
        "</agent></r>");
    EXPECT_EQ(userOf(*db, "ux", "a"), "c");
}

TEST_F(RunAs, InstanceWithoutANameHasNoUser) {
    const auto db = load(
        "<r><agent><productCode>ux</productCode>"
        "<instance><user>monitor</user></instance></agent></r>");
    ASSERT_EQ(db->getAgent("ux")->getNumInstances(), 1u);
    EXPECT_EQ(userOf(*db, "ux", ""), "");
}

TEST_F(RunAs, InstanceWithoutAUserHasAnEmptyOne) {
    const auto db = load(
        "<r><agent><productCode>ux</productCode><instance><name>a</name></instance></agent></r>");
    EXPECT_EQ(userOf(*db, "ux", "a"), "");
}

TEST_F(RunAs, AgentWithoutAProductCodeIsSkipped) {
    const auto db = load(
        "<r><agent><instance><name>a</name><user>u</user></instance></agent>"
        "<agent><productCode>ux</productCode></agent></r>");
    EXPECT_EQ(db->getNumAgents(), 1u);
    EXPECT_NE(db->getAgent("ux"), nullptr);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Agent element missing <productCode> element"));
}

TEST_F(RunAs, OnlyDirectChildrenOfThatNameCount) {
    const auto db = load(
        "<agent><productCode>no</productCode><x><agent><productCode>no</productCode></agent></x>"
        "<Agent><productCode>no</productCode></Agent>"
        "<agent k='v'><other/><productCode>ux</productCode><x><instance/></x></agent></agent>");
    EXPECT_EQ(db->getNumAgents(), 1u);
    EXPECT_EQ(db->getAgent("ux")->getNumInstances(), 0u);
}

TEST_F(RunAs, MissingFileIsAnEmptyDatabase) {
    const StartupDB db(path());
    EXPECT_EQ(db.getNumAgents(), 0u);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error reading file (defaults will be used): " + narrow(path()) +
                            ". Error: No such file or directory"));
}

TEST_F(RunAs, PipeInPlaceOfTheFileIsNotWaitedFor) {
    ASSERT_EQ(::mkfifo(narrow(path()).c_str(), 0600), 0);
    StartupDB db(path());
    EXPECT_EQ(db.getNumAgents(), 0u);
    EXPECT_EQ(db.save(), 0);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error reading file (defaults will be used): " + narrow(path()) +
                                ". Error: Illegal seek",
                            "Error opening file, " + narrow(path()) + ", in write mode: %"));
}

TEST_F(RunAs, EmptyFileIsAnEmptyDatabase) {
    const auto db = load("");
    EXPECT_EQ(db->getNumAgents(), 0u);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error reading file (defaults will be used): " + narrow(path()) +
                            ". Error: Success"));
}

TEST_F(RunAs, MalformedFileIsAnEmptyDatabase) {
    const auto db = load("<r><agent><productCode>ux</productCode></r>");
    EXPECT_EQ(db->getNumAgents(), 0u);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error parsing xml defaults will be used: 1:41: mismatched tag"));
}

TEST_F(RunAs, UnfinishedFileIsAnEmptyDatabase) {
    const auto db = load("<r><agent><productCode>ux</productCode></agent>");
    EXPECT_EQ(db->getNumAgents(), 0u);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error parsing xml defaults will be used: incomplete xml"));
}

TEST_F(RunAs, SaveReproducesTheFile) {
    const auto db = load(kFile);
    std::remove(scratch.path("runas.cfg").c_str());
    EXPECT_EQ(db->save(), 1);
    EXPECT_EQ(scratch.read("runas.cfg"), kFile);
}

TEST_F(RunAs, SaveReplacesWhatWasThere) {
    const auto db = load(std::string(kFile) + "<!-- a comment that makes the file longer -->");
    EXPECT_EQ(db->save(), 1);
    EXPECT_EQ(scratch.read("runas.cfg"), kFile);
}

TEST_F(RunAs, SaveOfAnEmptyDatabaseWritesTheRoot) {
    StartupDB db(path());
    EXPECT_EQ(db.save(), 1);
    EXPECT_EQ(scratch.read("runas.cfg"), "<runas>\n</runas>\n");
}

TEST_F(RunAs, SaveThatCannotOpenTheFileSaysSo) {
    const String unopenable(scratch.path("none/runas.cfg").c_str());
    StartupDB db(unopenable);
    traces.clear();
    EXPECT_EQ(db.save(), 0);
    EXPECT_THAT(traces.errors("zavrunas"),
                ElementsAre("Error opening file, " + narrow(unopenable) + ", in write mode: %"));
}

TEST_F(RunAs, EntriesAreAddedAndRemoved) {
    StartupDB db(path());
    db.addAgent(new AgentEntry("a"));
    db.addAgent(new AgentEntry("b"));
    db.addAgent(new AgentEntry("c"));
    db.removeAgent(3);
    db.removeAgent(1);
    EXPECT_EQ(db.getNumAgents(), 2u);
    EXPECT_EQ(narrow(db.getAgent(1u)->getProductCode()), "c");
    EXPECT_EQ(db.getAgent("b"), nullptr);
}

TEST_F(RunAs, RemovedInstanceLeavesItsSlot) {
    AgentEntry agent("ux");
    agent.addInstance(new InstanceEntry("a", "first"));
    agent.addInstance(new InstanceEntry("a", "second"));
    agent.removeInstance(2);
    agent.removeInstance(0);
    agent.removeInstance(0);
    EXPECT_EQ(agent.getNumInstances(), 2u);
    EXPECT_EQ(agent.getInstance(0u), nullptr);
    EXPECT_EQ(narrow(agent.getInstance("a")->getUser()), "second");
    agent.removeInstance(1);
    EXPECT_EQ(agent.getInstance("a"), nullptr);
}

TEST_F(RunAs, RemovedInstanceIsNotSaved) {
    const auto db = load(kFile);
    db->getAgent("ux")->removeInstance(0);
    EXPECT_EQ(db->save(), 1);
    const StartupDB again(path());
    EXPECT_EQ(again.getAgent("ux")->getNumInstances(), 1u);
    EXPECT_EQ(userOf(again, "ux", "spare"), "");
}

TEST_F(RunAs, UserCanBeReplaced) {
    InstanceEntry instance("main", "");
    instance.setUser("monitor");
    EXPECT_EQ(narrow(instance.getInstanceName()), "main");
    EXPECT_EQ(narrow(instance.getUser()), "monitor");
}

TEST_F(RunAs, ChildElementIsTheFirstOfItsName) {
    DOMElement parent("p");
    EXPECT_EQ(getChildElement(&parent, "none"), nullptr);
    EXPECT_EQ(getChildElement(nullptr, "c"), nullptr);
    EXPECT_EQ(getChildElement(&parent, nullptr), nullptr);
    auto* first = new DOMElement("c");
    parent.addChild(first);
    parent.addChild(new DOMElement("c"));
    EXPECT_EQ(getChildElement(&parent, "c"), first);
}

TEST_F(RunAs, WhatIsNoElementOrHasNoTagNameIsNoneOfOurs) {
    DOMElement root("r");
    root.addChild(new DOMElement(nullptr));
    root.getChildren()->append(new DOMAttr("agent", ""));
    auto* agent = new DOMElement("agent");
    root.addChild(agent);
    agent->addChild(new DOMElement(nullptr));
    agent->getChildren()->append(new DOMAttr("productCode", ""));
    agent->addChild(new DOMElement("productCode"));
    StartupDB db(path());
    db.buildModel(&root);
    EXPECT_EQ(db.getNumAgents(), 1u);
    db.buildModel(nullptr);
    EXPECT_EQ(db.getNumAgents(), 1u);
}

TEST_F(RunAs, LeavesWithoutTextAreEmpty) {
    DOMElement agent("agent");
    agent.addChild(new DOMElement("productCode"));
    const std::unique_ptr<AgentEntry> entry(buildAgentEntry(&agent));
    EXPECT_EQ(narrow(entry->getProductCode()), "");
}

}  // namespace
