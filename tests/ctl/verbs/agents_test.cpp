#include "ctl/verbs/agents.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Agents, AreShownAsATable) {
    const json rows = {{{"PRODUCT", "ux"},
                        {"VERSION", "06230100"},
                        {"RELEASE", "0"},
                        {"PLATFORM", "lx8266"},
                        {"HOSTTYPE", "LZ"},
                        {"HOSTPC", "lx8266"},
                        {"PRODDESC", "An agent"}}};
    const ctl::Page page = ctl::showAgents({{rows}}, Format::Text);
    EXPECT_EQ(page.out,
              "PRODUCT  VERSION   RELEASE  PLATFORM  SYSTEM  ARCHITECTURE  DESCRIPTION\n"
              "ux       06230100  0        lx8266    LZ      lx8266        An agent\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(Agents, ThatAreNoneAreSaid) {
    EXPECT_EQ(ctl::showAgents({}, Format::Text).out, "No products are listed.\n");
}

TEST(Agents, ThatCouldNotBeFoundOutAreAFailureThatSaysWhy) {
    const json warning = {{"text", "cinfo \x1b failed"},
                          {"command", "/h/bin/cinfo -d"},
                          {"exit", 3},
                          {"stderr", "no registry\n"}};
    const ctl::Page page = ctl::showAgents({{json::array(), json{warning}}}, Format::Text);
    EXPECT_EQ(page.out, "");
    EXPECT_EQ(page.err,
              "zavctl: warning: cinfo \\x1B failed\n"
              "  command: /h/bin/cinfo -d\n"
              "  end:     exit code 3\n"
              "  standard error:\n"
              "    no registry\n"
              "zavctl: what is installed could not be found out in full\n");
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    const ctl::Page asJson = ctl::showAgents({{json::array(), json{warning}}}, Format::Json);
    EXPECT_EQ(json::parse(asJson.out), (json{{"rows", json::array()}, {"warnings", {warning}}}));
    EXPECT_EQ(asJson.status, ctl::kHostReportedFailure);
}

TEST(Agents, AreRowsAsJson) {
    EXPECT_EQ(json::parse(ctl::showAgents({{json{{{"PRODUCT", "ux"}}}}}, Format::Json).out),
              (json{{"rows", {{{"PRODUCT", "ux"}}}}}));
    EXPECT_EQ(json::parse(ctl::showAgents({}, Format::Json).out), (json{{"rows", json::array()}}));
}

const json kInstances = {{{"product", "ux"},
                          {"instance", ""},
                          {"target", "h:UX"},
                          {"state", "running"},
                          {"user", "root"},
                          {"pid", 17}},
                         {{"product", "ux"},
                          {"instance", "db1"},
                          {"target", "db1:h:UX"},
                          {"state", "missing"},
                          {"user", "monitor"},
                          {"pid", nullptr}},
                         {{"product", "um"},
                          {"instance", ""},
                          {"target", "h:UA"},
                          {"state", "stopped"},
                          {"user", nullptr},
                          {"pid", nullptr}}};

TEST(Agents, ThatRunOrShouldAreShownBelow) {
    const ctl::Page page = ctl::showAgents({{json{{{"PRODUCT", "ux"}}}}, kInstances}, Format::Text);
    const std::string::size_type below = page.out.find("\n\n");
    ASSERT_NE(below, std::string::npos) << page.out;
    EXPECT_EQ(page.out.substr(below + 2),
              "INSTANCE  STATE                 USER     PROCESS\n"
              "h:UX      running               root     17\n"
              "db1:h:UX  should run, does not  monitor\n");
    EXPECT_EQ(page.status, ctl::kSuccess);
    const ctl::Page asJson = ctl::showAgents({{}, kInstances}, Format::Json);
    EXPECT_EQ(json::parse(asJson.out), (json{{"rows", json::array()}, {"instances", kInstances}}));
}

TEST(Agents, WhoseStateIsNotKnownAreShownWithANote) {
    ctl::Agents agents{{json{{{"PRODUCT", "ux"}}}}};
    agents.doubt = "no way";
    for (const Format format : {Format::Text, Format::Json}) {
        const ctl::Page page = ctl::showAgents(agents, format);
        EXPECT_NE(page.out.find("ux"), std::string::npos);
        EXPECT_EQ(page.err, "zavctl: note: which agents run is not known: no way\n");
        EXPECT_EQ(page.status, ctl::kSuccess);
    }
}

}  // namespace
