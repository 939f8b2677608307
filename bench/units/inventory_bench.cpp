// How long an inventory takes to parse: the time per line must not grow with the lines.
#include <benchmark/benchmark.h>

#include <string>

#include "tables/inventory.h"

namespace {

ZAV::String inventoryOf(std::int64_t lines) {
    std::string text = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
    for (std::int64_t i = 0; i < lines; ++i) {
        const std::string number = std::to_string(i);
        text += "\"p" + number + "\",\"Product number " + number +
                " with a description of some length\",\"lx8266\",\"06200000\",\"100\"\n";
    }
    return ZAV::String(text.c_str());
}

void inventory(benchmark::State& state) {
    const ZAV::String text = inventoryOf(state.range(0));
    for (auto _ : state) {
        std::int64_t products = 0;
        forEachProduct(text, [&products](const InstalledProduct&) {
            ++products;
            return 0;
        });
        if (products != state.range(0)) state.SkipWithError("not every line is a product");
    }
}
BENCHMARK(inventory)->Arg(10)->Arg(100)->Arg(1000)->Arg(10000);

}  // namespace

BENCHMARK_MAIN();
