// How long the inventory program takes.
// ctest-label: timing
#include <gtest/gtest.h>

#include "home/home_fixture.h"
#include "support/clock.h"

namespace {

using InventoryTiming = PreparedHomeTest;

TEST_F(InventoryTiming, ListingStartsNoProgramForEachEntry) {
    constexpr int kEntries = 2000;
    for (int i = 0; i < kEntries; ++i) {
        const std::string code = "p" + std::to_string(i);
        write("registry/" + code + "lx8266.ver",
              "ProdCode=" + code + "\nDescription=An agent\nPlatform=lx8266\nVersion=060100000\n" +
                  "Release=100\n");
    }
    const double listing = shortestOf(3, [this] { run({inHome("bin/cinfo"), "-d"}); });
    const double starting = shortestOf(3, [] {
        run({"/bin/sh", "-c",
             "n=0; until [ $n -ge " + std::to_string(kEntries) +
                 " ]; do n=$((n + 1)); /bin/true; done"});
    });
    EXPECT_LT(listing, starting / 2);
}

}  // namespace
