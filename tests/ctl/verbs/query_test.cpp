#include "ctl/verbs/query.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using nlohmann::json;

TEST(Query, ShowsRecordsAndCountsThem) {
    EXPECT_EQ(ctl::showQuery(json::array(), Format::Text).out, "0 rows\n");
    EXPECT_EQ(ctl::showQuery({{{"A", "1"}}}, Format::Text).out, "A  1\n\n1 row\n");
    EXPECT_EQ(ctl::showQuery({{{"A", "1"}}, {{"A", "2"}}}, Format::Text).out,
              "A  1\n\nA  2\n\n2 rows\n");
}

TEST(Query, GivesRowsAsJson) {
    const json rows = {{{"A", "1"}}, {{"A", 2}}};
    EXPECT_EQ(json::parse(ctl::showQuery(rows, Format::Json).out), (json{{"rows", rows}}));
}

}  // namespace
