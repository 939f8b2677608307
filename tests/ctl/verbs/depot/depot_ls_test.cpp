#include "ctl/verbs/depot/depot_ls.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

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

TEST(DepotLs, ShowsNamesAndMarksFolders) {
    const Page page = ctl::showDepot(listing(), false, Format::Text);
    EXPECT_EQ(page.out, "a\nb\\x07/\n");
    EXPECT_EQ(page.err, "");
    EXPECT_EQ(page.status, ctl::kSuccess);
}

TEST(DepotLs, ShowsTypesSizesAndTimesWhenAskedFor) {
    const Page page = ctl::showDepot(listing(), true, Format::Text);
    EXPECT_NE(page.out.find("MODIFIED"), std::string::npos);
    EXPECT_NE(page.out.find("2030-01-02T03:04:05Z"), std::string::npos);
    EXPECT_NE(page.out.find("1234"), std::string::npos);
}

TEST(DepotLs, SaysThatAListIsCut) {
    json cut = listing();
    cut["complete"] = false;
    EXPECT_EQ(ctl::showDepot(cut, false, Format::Text).err,
              "zavctl: the folder holds more; these are 2 of its entries\n");
}

TEST(DepotLs, ShowsNothingOfAnEmptyFolder) {
    json empty = listing();
    empty["entries"] = json::array();
    EXPECT_EQ(ctl::showDepot(empty, true, Format::Text).out, "");
}

TEST(DepotLs, GivesTheDocumentAsJson) {
    EXPECT_EQ(json::parse(ctl::showDepot(listing(), false, Format::Json).out), listing());
}

}  // namespace
