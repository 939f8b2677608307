#include "host/home/inventory.h"

#include <gtest/gtest.h>

#include "support/scratch_dir.h"

namespace {

using host::Inventory;
using host::readInventory;
using host::translatorPath;

const std::string kHeader = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";

Inventory listed(const std::vector<std::pair<std::string, std::string>>& entries) {
    std::string list = "noise\n" + kHeader;
    for (const auto& [code, platform] : entries) {
        list += "\"" + code + "\",\"A product\",\"" + platform + "\",\"010000000\",\"100\"\n";
    }
    Inventory inventory;
    inventory.products = host::productsIn(list + "no entry\n");
    return inventory;
}

TEST(Inventory, IsWhatTheHomesProgramLists) {
    ScratchDir home;
    home.script("bin/cinfo", "[ \"$1\" = -d ] || exit 1\nprintf '%s' '" + kHeader +
                                 "\"ux\",\"Load\",\"lx8266\",\"060100000\",\"100\"\n'\n");
    const Inventory inventory = readInventory(home.path());
    ASSERT_EQ(inventory.products.size(), 1U);
    EXPECT_EQ(inventory.products[0].code, "ux");
    EXPECT_EQ(inventory.products[0].platform, "lx8266");
    EXPECT_EQ(inventory.products[0].version, "060100000");
    EXPECT_TRUE(inventory.has("ux"));
    EXPECT_FALSE(inventory.has("um"));
}

TEST(Inventory, IsRememberedUntilTheNextOneThatCanBeRead) {
    ScratchDir home;
    home.script("bin/cinfo",
                "printf '%s' '" + kHeader +
                    "\"ux\",\"L\",\"l\",\"6\",\"1\"\n\"um\",\"L\",\"l\",\"6\",\"1\"\n'\n");
    readInventory(home.path());
    const auto first = host::lastInventory();
    ASSERT_TRUE(first);
    EXPECT_EQ(first->products, 2U);
    home.script("bin/cinfo", "exit 5");
    readInventory(home.path());
    EXPECT_EQ(host::lastInventory()->read, first->read);
    EXPECT_EQ(host::lastInventory()->products, 2U);
}

TEST(Inventory, IsEmptyWithTheReasonWhenTheProgramFails) {
    ScratchDir home;
    EXPECT_EQ(endInWords(readInventory(home.path()).result),
              "could not be started: No such file or directory");
    home.script("bin/cinfo",
                "printf '%s' '" + kHeader + "\"ux\",\"L\",\"l\",\"6\",\"1\"\n'\nexit 5\n");
    const Inventory failed = readInventory(home.path());
    EXPECT_EQ(endInWords(failed.result), "ended with exit code 5");
    EXPECT_TRUE(failed.products.empty());
}

TEST(Inventory, TextWithoutTheHeaderListsNothing) {
    EXPECT_TRUE(host::productsIn("\"ux\",\"L\",\"l\",\"6\",\"1\"\n").empty());
}

TEST(Inventory, TranslatorIsThatOfTheSharedComponent) {
    EXPECT_EQ(translatorPath("/h", listed({})), "");
    EXPECT_EQ(translatorPath("/h", listed({{"ux", "lx8266"}})), "");
    EXPECT_EQ(translatorPath("/h", listed({{"ax", "lx8266"}, {"ax", "li6263"}})),
              "/h/agtqvs6/lx8266/bin/zav_xa");
}

TEST(Inventory, TranslatorIsForThePlatformThatEndsLikeTheOperatingSystemAgents) {
    EXPECT_EQ(translatorPath("/h", listed({{"ax", "lx8266"}, {"ax", "li6263"}, {"lz", "li6243"}})),
              "/h/agtqvs6/li6263/bin/zav_xa")
        << "the last one when none ends alike";
    EXPECT_EQ(translatorPath("/h", listed({{"lz", "li6266"}, {"ax", "lx8266"}, {"ax", "li6263"}})),
              "/h/agtqvs6/lx8266/bin/zav_xa");
    EXPECT_EQ(translatorPath("/h", listed({{"ax", "sol273"}, {"ax", "sol286"}})),
              "/h/agtqvs6/sol286/bin/zav_xa");
}

}  // namespace
