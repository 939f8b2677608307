#include "ctl/verbs/query.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

const ctl::TableQuery kInventory = {"KINAGT", {}};

ctl::TableQuery request(const std::vector<ctl::Condition>& where) {
    return {"KAGREQT", where};
}

TEST(Query, ShowsRecordsAndCountsThem) {
    const auto shown = [](const json& rows) {
        return ctl::showQuery(kInventory, {rows}, Format::Text).out;
    };
    EXPECT_EQ(shown(json::array()), "0 rows\n");
    EXPECT_EQ(shown({{{"A", "1"}}}), "A  1\n\n1 row\n");
    EXPECT_EQ(shown({{{"A", "1"}}, {{"A", "2"}}}), "A  1\n\nA  2\n\n2 rows\n");
}

TEST(Query, ThatActsEndsAsItsReplySays) {
    const json done = {{{"RETVAL", 0}}};
    EXPECT_EQ(ctl::showQuery(request({}), {done}, Format::Text).status, ctl::kSuccess);
    const json refused = {{{"RETVAL", 1003}, {"RETMSGID", "ZAV1003E"}}};
    const ctl::Page page = ctl::showQuery(request({}), {refused}, Format::Text);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(page.err, "zavctl: the host refused: ZAV1003E: the request names no product\n");
    EXPECT_EQ(ctl::showQuery(request({}), {refused}, Format::Json).status,
              ctl::kHostReportedFailure);
    EXPECT_EQ(ctl::showQuery(request({}), {}, Format::Text).status, ctl::kHostReportedFailure);
}

TEST(Query, WhoseRowsMayNotBeAllIsNoSuccess) {
    const json warnings = {{{"text", "the inventory could not be taken"}}};
    const ctl::QueryAnswer answer = {json::array(), warnings, json::array()};
    const ctl::Page page = ctl::showQuery(kInventory, answer, Format::Text);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_EQ(page.err,
              "zavctl: warning: the inventory could not be taken\n"
              "zavctl: the rows could not be found out in full\n");
    EXPECT_EQ(ctl::showQuery(kInventory, answer, Format::Json).status, ctl::kHostReportedFailure);
}

TEST(Query, ThatActsHasAVerbInItsPlace) {
    const std::pair<std::vector<ctl::Condition>, const char*> cases[] = {
        {{{"COMMAND", "=", "STOP"}, {"PRODUCT", "=", "ux"}}, "zavctl stop ux"},
        {{{"COMMAND", "=", "INSTALL"}}, "zavctl install PRODUCT VERSION -- COMMAND"},
        {{{"COMMAND", "=", "SETCONFIG"}, {"PRODUCT", "=", "um"}},
         "zavctl ua-config --metafile FILE"},
        {{{"COMMAND", "=", "SETCONFIG"}, {"PRODUCT", "=", "ux"}},
         "zavctl config set ux --file FILE"},
        {{{"COMMAND", "=", "COMPLETE_INSTALL"}}, "zavctl complete-install"},
        {{{"COMMAND", "=", "NOPE"}}, ""},
        {{}, ""},
    };
    for (const auto& [where, line] : cases)
        EXPECT_EQ(ctl::verbInPlaceOf(request(where)), line);
}

TEST(Query, ThatActsOnAnInstanceHasAVerbThatActsOnTheSameOne) {
    const auto verbFor = [](const std::string& command, const std::string& target,
                            const std::string& optional = "") {
        return ctl::verbInPlaceOf(request({{"COMMAND", "=", command},
                                           {"PRODUCT", "=", "ux"},
                                           {"TARGETMSN", "=", target},
                                           {"OPTIONAL", "=", optional}}));
    };
    EXPECT_EQ(verbFor("STOP", "db1:h:UX"), "zavctl stop ux --target db1:h:UX");
    EXPECT_EQ(verbFor("START", "db1:h:UX"), "zavctl start ux --target db1:h:UX");
    EXPECT_EQ(verbFor("START", "db1", "INSTANCE"), "zavctl start ux --instance db1");
    EXPECT_EQ(verbFor("RESTART", "a b"), "zavctl restart ux --target 'a b'");
    EXPECT_EQ(verbFor("GETCONFIG", "db1:h:UX"), "zavctl config get ux --target db1:h:UX");
    EXPECT_EQ(verbFor("SETCONFIG", "db1:h:UX"),
              "zavctl config set ux --target db1:h:UX --file FILE");
    EXPECT_EQ(verbFor("REMOVEINSTANCE", "db1:h:UX"), "zavctl remove-instance ux db1:h:UX");
    EXPECT_EQ(verbFor("REMOVEINSTANCE", ""), "zavctl remove-instance ux TARGET");
    EXPECT_EQ(verbFor("UNINSTALL", "db1:h:UX"), "zavctl uninstall ux") << "it takes the product";
    EXPECT_EQ(ctl::verbInPlaceOf(request({{"COMMAND", "=", "SETCONFIG"},
                                          {"PRODUCT", "=", "um"},
                                          {"TARGETMSN", "=", "db1:h:UA"},
                                          {"UACONFIG", "=", "disks.mdl"}})),
              "zavctl ua-config --metafile disks.mdl --target db1:h:UA");
}

TEST(Query, GivesRowsAsJson) {
    const json rows = {{{"A", "1"}}, {{"A", 2}}};
    EXPECT_EQ(json::parse(ctl::showQuery(kInventory, {rows}, Format::Json).out),
              (json{{"rows", rows}}));
}

TEST(Query, ShowsNoConfigurationToPeople) {
    for (const char* command : {"GETCONFIG", "SETCONFIG"}) {
        const json rows = {{{"COMMAND", command}, {"CONTEXT", "COLOUR=red"}, {"RETVAL", 0}}};
        const std::string shown = ctl::showQuery(request({}), {rows}, Format::Text).out;
        EXPECT_NE(shown.find("CONTEXT  ***\n"), std::string::npos) << shown;
        EXPECT_EQ(json::parse(ctl::showQuery(request({}), {rows}, Format::Json).out)["rows"], rows);
    }
    const json rows = {{{"COMMAND", "INSTALL"}, {"CONTEXT", "/bin/x key=y z"}, {"RETVAL", 0}}};
    EXPECT_NE(ctl::showQuery(request({}), {rows}, Format::Text).out.find("  /bin/x key=*** z\n"),
              std::string::npos);
}

}  // namespace
