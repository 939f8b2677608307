// Searching, editing and splitting texts, beside the same done with the standard library's string
// of 16-bit units.

#include <benchmark/benchmark.h>

#include <algorithm>
#include <string>

#include "base/zavstr.h"
#include "base/zavtoken.h"
#include "texts.h"

using ZAV::String;

namespace {

std::size_t sizeOf(const benchmark::State& state) {
    return static_cast<std::size_t>(state.range(0));
}

std::u16string standardText(std::size_t size) {
    const std::string text = narrowText(size);
    return std::u16string(text.begin(), text.end());
}

// ---- This library -------------------------------------------------------------------------------

void findUnitString(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find('~'));
}

void findTextString(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    const String wanted("quick red fox");
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find(wanted, 0));
}

void replaceString(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    const String what("quick"), with("very slow");
    for (auto _ : state)
        benchmark::DoNotOptimize(String::replace(text, what, with).getData());
}

void trimString(benchmark::State& state) {
    const String blanks("        ");
    const String text = blanks + ownText(sizeOf(state)) + blanks;
    for (auto _ : state) {
        String trimmed(text);
        benchmark::DoNotOptimize(trimmed.trim().getData());
    }
}

void splitString(benchmark::State& state) {
    const String text = ownText(sizeOf(state));
    const String delimiters(", ");
    for (auto _ : state) {
        StringTokenizer tokenizer(text, delimiters);
        while (tokenizer.hasMoreTokens())
            benchmark::DoNotOptimize(tokenizer.nextToken().getData());
    }
}

// ---- The standard library -----------------------------------------------------------------------

void findUnitStandard(benchmark::State& state) {
    const std::u16string text = standardText(sizeOf(state));
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find(u'~'));
}

void findTextStandard(benchmark::State& state) {
    const std::u16string text = standardText(sizeOf(state));
    const std::u16string wanted(u"quick red fox");
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find(wanted));
}

void replaceStandard(benchmark::State& state) {
    const std::u16string text = standardText(sizeOf(state));
    const std::u16string what(u"quick"), with(u"very slow");
    for (auto _ : state) {
        std::u16string out;
        std::size_t at = 0;
        for (std::size_t hit; (hit = text.find(what, at)) != text.npos; at = hit + what.size()) {
            out.append(text, at, hit - at);
            out += with;
        }
        out.append(text, at);
        benchmark::DoNotOptimize(out.data());
    }
}

void trimStandard(benchmark::State& state) {
    const std::u16string blanks(8, u' ');
    const std::u16string text = blanks + standardText(sizeOf(state)) + blanks;
    for (auto _ : state) {
        std::u16string trimmed(text);
        trimmed.erase(trimmed.find_last_not_of(u" \t\r\n\f") + 1);
        trimmed.erase(0, trimmed.find_first_not_of(u" \t\r\n\f"));
        benchmark::DoNotOptimize(trimmed.data());
    }
}

void splitStandard(benchmark::State& state) {
    const std::u16string text = standardText(sizeOf(state));
    const std::u16string delimiters(u", ");
    for (auto _ : state) {
        std::size_t end = 0;
        for (std::size_t at; (at = text.find_first_not_of(delimiters, end)) != text.npos;) {
            end = std::min(text.find_first_of(delimiters, at), text.size());
            const std::u16string token(text, at, end - at);
            benchmark::DoNotOptimize(token.data());
        }
    }
}

void addOperation(const std::string& name, void (*own)(benchmark::State&),
                  void (*standard)(benchmark::State&)) {
    for (const auto& [way, run] : {std::pair{"/string", own}, std::pair{"/standard", standard}}) {
        benchmark::RegisterBenchmark((name + way).c_str(), run)
            ->Arg(32)
            ->Arg(256)
            ->Arg(1024)
            ->Arg(65536);
    }
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    addOperation("find_unit", findUnitString, findUnitStandard);
    addOperation("find_text", findTextString, findTextStandard);
    addOperation("replace", replaceString, replaceStandard);
    addOperation("trim", trimString, trimStandard);
    addOperation("split", splitString, splitStandard);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
