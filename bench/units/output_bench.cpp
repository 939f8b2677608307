// How the cost of running a command and collecting its output grows with the output.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <string>

#include "temporary_file.h"
#include "util/zavutil.h"

using ZAV::String;

namespace {

void output(benchmark::State& state) {
    const auto size = static_cast<std::size_t>(state.range(0));
    const TemporaryFile file(std::string(size, 'x'));
    const String command((std::string("/bin/cat ") + file.path()).c_str());
    for (auto _ : state) {
        int rc = -1;
        String out, err;
        if (!ZAV::Util::runCommand(command, rc, out, err, String(), false) || rc != 0 ||
            out.length() != size) {
            state.SkipWithError("the output is not there");
        }
    }
}
BENCHMARK(output)
    ->RangeMultiplier(2)
    ->Range(16 << 10, 64 << 20)
    ->Iterations(11)
    ->UseRealTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    ::unsetenv("KBB_RAS1");
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
