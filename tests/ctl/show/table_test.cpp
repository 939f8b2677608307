#include "ctl/show/table.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using nlohmann::json;

TEST(Table, IsAlignedByCharactersNotBytes) {
    const json rows = {{{"P", "ux"}, {"D", "gr\xc3\xbc\xc3\x9f"}, {"E", "1"}},
                       {{"P", "longer"}, {"D", "x"}, {"E", "2"}}};
    EXPECT_EQ(ctl::tableText(rows, {{"P", "PRODUCT"}, {"D", "DESC"}, {"E", "N"}}),
              "PRODUCT  DESC  N\n"
              "ux       gr\xc3\xbc\xc3\x9f  1\n"
              "longer   x     2\n");
}

TEST(Table, HasNoBlanksAtTheEndsOfLinesAndNoControlCharacters) {
    const json rows = {{{"A", "x\x1b"}}, {{"A", "y"}, {"B", "z"}}};
    EXPECT_EQ(ctl::tableText(rows, {{"A", "A"}, {"B", "B"}}), "A      B\nx\\x1B\ny      z\n");
}

TEST(Table, FitsEightyColumnsAndLosesNothing) {
    const json rows = {{{"A", "ux"},
                        {"B", std::string(30, 'b')},
                        {"C", std::string(30, 'c') + " end of a text!"}}};
    EXPECT_EQ(ctl::tableText(rows, {{"A", "A"}, {"B", "B"}, {"C", "C"}}),
              "A   B                               C\n"
              "ux  " +
                  std::string(30, 'b') + "  " + std::string(30, 'c') + " end of a\n" +
                  std::string(36, ' ') + "text!\n");
}

TEST(Table, BreaksNoNameInTheFirstColumn) {
    const std::string name = std::string(40, 'i');
    const std::string text(30, 'x');
    const std::vector<ctl::TableColumn> columns = {{"A", "A"}, {"B", "B"}, {"C", "C"}};
    EXPECT_EQ(ctl::tableText({{{"A", name}, {"B", text}, {"C", text}}}, columns),
              "A" + std::string(41, ' ') + "B" + std::string(19, ' ') + "C\n" + name + "  " +
                  std::string(18, 'x') + "  " + std::string(18, 'x') + "\n" + std::string(42, ' ') +
                  std::string(12, 'x') + "        " + std::string(12, 'x') + "\n");
    EXPECT_EQ(ctl::tableText({{{"A", std::string(100, 'i')}}}, {{"A", "A"}}),
              "A\n" + std::string(80, 'i') + "\n" + std::string(20, 'i') + "\n");
}

TEST(Records, FitEightyColumnsAndLoseNothing) {
    const json rows = {{{"NAME", std::string(100, 'x')}}};
    EXPECT_EQ(ctl::recordsText(rows),
              "NAME  " + std::string(74, 'x') + "\n      " + std::string(26, 'x') + "\n");
}

TEST(Table, OfNoRowsIsItsTitles) {
    EXPECT_EQ(ctl::tableText(json::array(), {{"A", "FIRST"}, {"B", "SECOND"}}), "FIRST  SECOND\n");
}

TEST(Records, LeaveEmptyColumnsOut) {
    const json rows = {{{"A", "1"}, {"BB", ""}, {"CCC", 3}}, {{"A", "x\ny"}}};
    EXPECT_EQ(ctl::recordsText(rows), "A    1\nCCC  3\n\nA  x\\x0Ay\n");
    EXPECT_EQ(ctl::recordsText(json::array()), "");
}

TEST(Records, HideSecrets) {
    EXPECT_EQ(ctl::recordsText({{{"CONTEXT", "/bin/setup password=hunter2 -q"}}}),
              "CONTEXT  /bin/setup password=*** -q\n");
    EXPECT_EQ(ctl::tableText({{{"A", "pwd=x"}}}, {{"A", "A"}}), "A\npwd=***\n");
}

}  // namespace
