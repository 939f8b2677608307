// How long a property file takes to be read: the time per line must not grow with the lines.
#include <benchmark/benchmark.h>

#include <string>

#include "base/zavrbndl.h"
#include "temporary_file.h"

namespace {

std::string propertiesOf(std::int64_t lines) {
    std::string text = "# properties\n";
    for (std::int64_t i = 0; i < lines; ++i)
        text += "KEY_" + std::to_string(i) + " = value of some length, as a path has it\n";
    return text;
}

void properties(benchmark::State& state) {
    const TemporaryFile file(propertiesOf(state.range(0)));
    const ZAV::String path(file.path());
    const ZAV::String last(("KEY_" + std::to_string(state.range(0) - 1)).c_str());
    for (auto _ : state) {
        const ZAV::ResourceBundle bundle(path, '#');
        if (bundle.getValue(last) == nullptr) state.SkipWithError("a line is missing");
    }
}
BENCHMARK(properties)->Arg(10)->Arg(100)->Arg(1000)->Arg(10000);

}  // namespace

BENCHMARK_MAIN();
