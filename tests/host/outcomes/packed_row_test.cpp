#include "host/outcomes/packed_row.h"

#include <gtest/gtest.h>

namespace {

TEST(PackedRow, IsTheSameRowAgain) {
    const std::string blanks(3000, ' ');
    for (const std::string& row :
         {std::string(), std::string("x"), std::string(" "), blanks, "x" + blanks, blanks + "x",
          blanks + "one two   three" + blanks + '\0' + std::string(9, ' ') + "\xFF",
          std::string(500, 'x'), std::string(8, ' ') + "y"}) {
        EXPECT_EQ(host::unpackRow(host::packRow(row)), row);
    }
}

TEST(PackedRow, TakesLittleMemory) {
    const std::string row = "t1" + std::string(3000, ' ') + "START" + std::string(1000, ' ');
    EXPECT_LE(host::packRow(row).size(), 32U);
    EXPECT_LE(host::packRow(std::string(4000, 'x')).size(), 4032U);
}

}  // namespace
