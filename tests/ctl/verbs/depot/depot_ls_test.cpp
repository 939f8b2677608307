#include "ctl/verbs/depot/depot_ls.h"

#include <gtest/gtest.h>

#include <ctime>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "support/scoped_env.h"

namespace {

using ctl::Format;
using ctl::Page;
using nlohmann::json;

json listing() {
    return json::parse(R"({"path": "", "type": "directory", "entries": [
        {"name": "a", "type": "file", "bytes": 1234, "modified": "2030-01-02T03:04:05Z"},
        {"name": "b\u0007", "type": "directory", "bytes": 0, "modified": "2030-01-02T03:04:05Z"}],
        "complete": true})");
}

/// As text, three minutes after the times in it.
Page shown(const json& listing, bool isLong) {
    return ctl::showDepot(listing, isLong, Format::Text, *ctl::parseTime("2030-01-02T03:07:05Z"));
}

TEST(DepotLs, ShowsNamesAndMarksFolders) {
    const Page page = shown(listing(), false);
    EXPECT_EQ(page.out, "a\nb\\x07/\n");
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(DepotLs, ShowsTypesSizesAndLocalTimesWhenAskedFor) {
    const ScopedEnv zone("TZ", "EAST-3");
    ::tzset();
    const Page page = shown(listing(), true);
    EXPECT_NE(page.out.find("MODIFIED"), std::string::npos);
    EXPECT_NE(page.out.find("  06:04:05, 3 min ago  a\n"), std::string::npos) << page.out;
    EXPECT_NE(page.out.find("1234"), std::string::npos);
}

TEST(DepotLs, SaysThatAListIsCut) {
    json cut = listing();
    cut["complete"] = false;
    EXPECT_EQ(shown(cut, false).err, "zavctl: the folder holds more; these are 2 of its entries\n");
}

TEST(DepotLs, ShowsNothingOfAnEmptyFolder) {
    json empty = listing();
    empty["entries"] = json::array();
    EXPECT_EQ(shown(empty, true).out, "");
}

TEST(DepotLs, TakesNoOtherDocumentForAList) {
    for (const json& document : {json(), json(7), json::array({1}), json{{"entries", 7}}})
        EXPECT_THROW(shown(document, true), ctl::Failure) << document;
    const json odd = {{"entries", {7, nullptr, {{"name", 7}, {"bytes", "x"}}}}};
    EXPECT_EQ(shown(odd, false).out, "\n\n7\n");
    EXPECT_NE(shown(odd, true).out, "");
}

TEST(DepotLs, GivesTheDocumentAsJson) {
    EXPECT_EQ(json::parse(ctl::showDepot(listing(), false, Format::Json, {}).out), listing());
}

}  // namespace
