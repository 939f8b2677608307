// How the cost of reading an inventory grows.
// ctest-label: timing
#include <gtest/gtest.h>

#include <string>

#include "support/process/growth.h"
#include "support/trace_capture.h"
#include "tables/inventory.h"

namespace {

std::string inventoryOf(unsigned products) {
    std::string text = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
    for (unsigned i = 0; i < products; ++i) {
        const std::string number = std::to_string(i);
        text += "\"p" + number + "\",\"Product number " + number +
                " with a description of some length\",\"lx8266\",\"06200000\",\"100\"\n";
    }
    return text;
}

TEST(InventoryTiming, ReadingGrowsInProportionToTheNumberOfProducts) {
    const TraceCapture quiet("ERROR");
    const double growth = growthOverEightfold(1250, [](unsigned products) {
        unsigned found = 0;
        const auto count = [&found](const InstalledProduct&) {
            ++found;
            return 0;
        };
        EXPECT_EQ(forEachProduct(inventoryOf(products).c_str(), count), 0);
        EXPECT_EQ(found, products);
    });
    EXPECT_LT(growth, kProportionate);
}

}  // namespace
