// How the cost of filling a map and of asking it grows with its keys.
#include <benchmark/benchmark.h>

#include <string>
#include <vector>

#include "base/zavhmap.h"

using ZAV::String;

namespace {

std::vector<String> keysOf(std::int64_t count) {
    std::vector<String> keys;
    for (std::int64_t i = 0; i < count; ++i)
        keys.emplace_back(("key number " + std::to_string(i)).c_str());
    return keys;
}

/// Every key is put and asked for once.
void keys(benchmark::State& state) {
    const std::vector<String> all = keysOf(state.range(0));
    const String value("value");
    for (auto _ : state) {
        ZAV::StrStrMap map;
        for (const String& key : all)
            map.put(key, value);
        String found;
        for (const String& key : all) {
            if (!map.get(key, found)) state.SkipWithError("a key is missing");
        }
    }
}
BENCHMARK(keys)->RangeMultiplier(10)->Range(1, 100000);

}  // namespace

BENCHMARK_MAIN();
