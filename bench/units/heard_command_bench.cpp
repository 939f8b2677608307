// What hearing a command costs: the same script with the host's ear on the thread and without.
//
// Both take turns, and turns to be the first, so that whatever else the machine does meets both
// alike; a turn of both is one iteration. "run" is the median without the ear in microseconds,
// "ratio" the median with it divided by that.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "host/commands/ear.h"
#include "temporary_file.h"
#include "util/zavutil.h"

namespace {

void runCommand(const ZAV::String& command) {
    int rc = -1;
    ZAV::String out;
    ZAV::String err;
    if (!ZAV::Util::runCommand(command, rc, out, err, ZAV::String(), false) || rc != 0) {
        throw std::runtime_error("no run");
    }
}

/// As the host has one, but it can be taken off.
class Ear final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override { recorder_.hear(line); }
    void take() {
        if (recorder_.take().commands.size() != 1) throw std::runtime_error("nothing was heard");
    }

private:
    host::Recorder recorder_;
};

double timeOf(const ZAV::String& command) {
    const auto start = std::chrono::steady_clock::now();
    runCommand(command);
    const std::chrono::duration<double, std::micro> taken =
        std::chrono::steady_clock::now() - start;
    return taken.count();
}

double heardTimeOf(const ZAV::String& command) {
    Ear ear;
    const ras1::Listening listening(ear, host::heardUnits());
    const double time = timeOf(command);
    ear.take();
    return time;
}

double median(std::vector<double> values) {
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

void compare(benchmark::State& state, const char* program) {
    const ZAV::String command(program);
    std::vector<double> plain;
    std::vector<double> heard;
    for (auto _ : state) {
        const bool plainFirst = plain.size() % 2 == 0;
        if (plainFirst) plain.push_back(timeOf(command));
        heard.push_back(heardTimeOf(command));
        if (!plainFirst) plain.push_back(timeOf(command));
    }
    state.counters["run"] = median(plain);
    state.counters["ratio"] = median(heard) / median(plain);
}

void add(const std::string& name, const char* program, benchmark::IterationCount turns) {
    benchmark::RegisterBenchmark(name.c_str(),
                                 [=](benchmark::State& state) { compare(state, program); })
        ->Iterations(turns)
        ->Unit(benchmark::kMillisecond);
}

/// A script that prints this many bytes.
std::string printing(const TemporaryFile& text) {
    return "#!/bin/sh\nexec cat " + std::string(text.path()) + "\n";
}

}  // namespace

int main(int argc, char** argv) {
    ::unsetenv("KBB_RAS1");
    benchmark::Initialize(&argc, argv);
    const TemporaryFile line("#!/bin/sh\necho one line\n");
    const TemporaryFile tens(std::string(std::size_t{64} << 10, 'x'));
    const TemporaryFile millions(std::string(std::size_t{4} << 20, 'x'));
    const TemporaryFile printsTens(printing(tens));
    const TemporaryFile printsMillions(printing(millions));
    add("heard/line", line.path(), 2000);
    add("heard/64KiB", printsTens.path(), 1000);
    add("heard/4MiB", printsMillions.path(), 100);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
