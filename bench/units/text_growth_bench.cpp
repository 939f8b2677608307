// How the cost of building and working through long texts grows with their length.

#include <benchmark/benchmark.h>

#include <cmath>
#include <string>
#include <vector>

#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "texts.h"

using ZAV::String;

namespace {

std::size_t sizeOf(const benchmark::State& state) {
    return static_cast<std::size_t>(state.range(0));
}

/// Lengths up to `size` from two thirds of it. A text that is appended to moves to a block of one
/// and a half times the size whenever it is full, so the number of characters that are copied on
/// the way depends on how far the text's end is from the last of these steps: for a single length
/// it is between 2 and 3 times the length. Lengths spread over a whole step show the mean.
std::vector<std::size_t> lengthsTo(std::size_t size) {
    constexpr int kLengths = 8;
    constexpr double kStep = 1.5;
    std::vector<std::size_t> lengths;
    for (int i = 0; i < kLengths; ++i) {
        const double factor = std::pow(kStep, static_cast<double>(i) / kLengths);
        lengths.push_back(static_cast<std::size_t>(static_cast<double>(size) / factor));
    }
    return lengths;
}

void appendUnits(benchmark::State& state) {
    const std::vector<std::size_t> lengths = lengthsTo(sizeOf(state));
    for (auto _ : state) {
        for (const std::size_t length : lengths) {
            String text;
            for (std::size_t i = 0; i < length; ++i)
                text.append('x');
            benchmark::DoNotOptimize(text.getData());
        }
    }
}

/// By a line's length at a time.
void appendTexts(benchmark::State& state) {
    const String line = ownText(64);
    const std::vector<std::size_t> lengths = lengthsTo(sizeOf(state));
    for (auto _ : state) {
        for (const std::size_t length : lengths) {
            String text;
            for (std::size_t i = 0; i < length; i += 64)
                text.append(line);
            benchmark::DoNotOptimize(text.getData());
        }
    }
}

void insertEscapes(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    const String special(",");
    for (auto _ : state) {
        String escaped(text);
        benchmark::DoNotOptimize(escaped.insertEscapes('\\', special).getData());
    }
}

/// The text is a tenth shorter than its nominal length. At a power of two, the text and its copy
/// compete for the same lines of the processor's first cache, which makes some lengths 1.6 times
/// slower.
void replaceWords(benchmark::State& state) {
    const String text = ownText(sizeOf(state) / 10 * 9);
    const String what("quick"), with("very slow");
    for (auto _ : state)
        benchmark::DoNotOptimize(String::replace(text, what, with).getData());
}

void splitWords(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    const String delimiters(", ");
    for (auto _ : state) {
        StringTokenizer tokenizer(text, delimiters);
        while (tokenizer.hasMoreTokens())
            benchmark::DoNotOptimize(tokenizer.nextToken().getData());
    }
}

void addGrowth(const std::string& name, void (*run)(benchmark::State&)) {
    benchmark::RegisterBenchmark(("growth/" + name).c_str(), run)
        ->RangeMultiplier(4)
        ->Range(1 << 10, 4 << 20);
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    addGrowth("append_units", appendUnits);
    addGrowth("append_texts", appendTexts);
    addGrowth("insert_escapes", insertEscapes);
    addGrowth("replace", replaceWords);
    addGrowth("split", splitWords);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
