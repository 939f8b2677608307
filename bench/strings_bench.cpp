// Text: conversions beside bare iconv with a kept descriptor, searching, editing, splitting.
//
// Every conversion of this library makes its owned result; iconv is given its buffers, so its
// figures are those of the conversion alone.

#include <benchmark/benchmark.h>
#include <iconv.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "base/zavstr.h"
#include "base/zavtoken.h"

using ZAV::CharStar;
using ZAV::String;

namespace {

enum Kind : int { kAscii, kUtf8, kLatin1 };

/// Converts in the code page of that kind from here on.
void useLocaleOf(int kind) {
    ::setenv("LC_ALL", kind == kLatin1 ? "C" : "C.UTF-8", 1);
    String::initialize();
}

/// Text of that kind, `size` bytes with some room for rounding.
std::string sample(int kind, std::size_t size) {
    const std::string pattern = kind == kAscii  ? "The quick brown fox, 0123456789 "
                                : kind == kUtf8 ? "Gr\xC3\xB6\xC3\x9F"
                                                  "e \xE2\x82\xAC 12, "
                                                : "Gr\xF6\xDF"
                                                  "e \xA3 12, ";
    std::string text;
    while (text.size() < size)
        text += pattern;
    if (kind != kUtf8) text.resize(size);
    return text;
}

class Iconv {
public:
    Iconv(const char* to, const char* from) : descriptor_(::iconv_open(to, from)) {}
    ~Iconv() { ::iconv_close(descriptor_); }
    Iconv(const Iconv&) = delete;
    Iconv& operator=(const Iconv&) = delete;

    void convert(const char* text, std::size_t length, char* out, std::size_t room) {
        char* in = const_cast<char*>(text);
        ::iconv(descriptor_, nullptr, nullptr, nullptr, nullptr);
        benchmark::DoNotOptimize(::iconv(descriptor_, &in, &length, &out, &room));
    }

private:
    iconv_t descriptor_;
};

const char* codesetOf(int kind) {
    return kind == kLatin1 ? "ISO-8859-1" : "UTF-8";
}

void finish(benchmark::State& state, std::size_t bytes) {
    state.SetBytesProcessed(static_cast<std::int64_t>(bytes) * state.iterations());
}

int kindOf(const benchmark::State& state) {
    return static_cast<int>(state.range(0));
}

std::string sampleOf(const benchmark::State& state) {
    return sample(kindOf(state), static_cast<std::size_t>(state.range(1)));
}

void stringFromNarrow(benchmark::State& state) {
    useLocaleOf(kindOf(state));
    const std::string text = sampleOf(state);
    for (auto _ : state) {
        const String converted(text.c_str());
        benchmark::DoNotOptimize(converted.getData());
    }
    finish(state, text.size());
}

void iconvFromNarrow(benchmark::State& state) {
    const std::string text = sampleOf(state);
    Iconv iconv("UTF-16LE", codesetOf(kindOf(state)));
    std::vector<char> out(text.size() * 2 + 2);
    for (auto _ : state) {
        iconv.convert(text.c_str(), text.size() + 1, out.data(), out.size());
        benchmark::ClobberMemory();
    }
    finish(state, text.size());
}

void stringToNarrow(benchmark::State& state) {
    useLocaleOf(kindOf(state));
    const std::string text = sampleOf(state);
    const String wide(text.c_str());
    for (auto _ : state) {
        const CharStar converted = wide.c_str();
        benchmark::DoNotOptimize(static_cast<const char*>(converted));
    }
    finish(state, text.size());
}

void iconvToNarrow(benchmark::State& state) {
    useLocaleOf(kindOf(state));
    const std::string text = sampleOf(state);
    const String wide(text.c_str());
    Iconv iconv(codesetOf(kindOf(state)), "UTF-16LE");
    // The room that c_str() has, so that both cut the text at the same place.
    std::vector<char> out(wide.length() + 1);
    for (auto _ : state) {
        iconv.convert(reinterpret_cast<const char*>(wide.getData()), out.size() * 2, out.data(),
                      out.size());
        benchmark::ClobberMemory();
    }
    finish(state, text.size());
}

void everySize(benchmark::internal::Benchmark* bench) {
    bench->ArgNames({"kind", "bytes"});
    for (const int kind : {kAscii, kUtf8, kLatin1}) {
        for (const int bytes : {32, 256, 65536})
            bench->Args({kind, bytes});
    }
}

BENCHMARK(stringFromNarrow)->Apply(everySize);
BENCHMARK(iconvFromNarrow)->Apply(everySize);
BENCHMARK(stringToNarrow)->Apply(everySize);
BENCHMARK(iconvToNarrow)->Apply(everySize);

std::size_t sizeOf(const benchmark::State& state) {
    return static_cast<std::size_t>(state.range(0));
}

String asciiText(const benchmark::State& state) {
    useLocaleOf(kAscii);
    return String(sample(kAscii, sizeOf(state)).c_str());
}

void findUnit(benchmark::State& state) {
    const String text = asciiText(state);
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find('~'));
    finish(state, sizeOf(state));
}

void findText(benchmark::State& state) {
    const String text = asciiText(state);
    const String wanted("quick red fox");
    for (auto _ : state)
        benchmark::DoNotOptimize(text.find(wanted, 0));
    finish(state, sizeOf(state));
}

void replaceText(benchmark::State& state) {
    const String text = asciiText(state);
    const String what("quick"), with("very slow");
    for (auto _ : state)
        benchmark::DoNotOptimize(String::replace(text, what, with).getData());
    finish(state, sizeOf(state));
}

void trimText(benchmark::State& state) {
    const String blanks(std::string(8, ' ').c_str());
    const String text = blanks + asciiText(state) + blanks;
    for (auto _ : state) {
        String trimmed(text);
        benchmark::DoNotOptimize(trimmed.trim().getData());
    }
    finish(state, sizeOf(state));
}

void appendUnits(benchmark::State& state) {
    for (auto _ : state) {
        String text;
        for (std::size_t i = 0; i < sizeOf(state); ++i)
            text.append('x');
        benchmark::DoNotOptimize(text.getData());
    }
    finish(state, sizeOf(state));
}

void insertAndRemoveEscapes(benchmark::State& state) {
    const String text = asciiText(state);
    const String special(",");
    for (auto _ : state) {
        String escaped(text);
        benchmark::DoNotOptimize(
            escaped.insertEscapes('\\', special).removeEscapes('\\').getData());
    }
    finish(state, sizeOf(state));
}

void splitText(benchmark::State& state) {
    const String text = asciiText(state);
    const String delimiters(", ");
    for (auto _ : state) {
        StringTokenizer tokenizer(text, delimiters);
        while (tokenizer.hasMoreTokens())
            benchmark::DoNotOptimize(tokenizer.nextToken().getData());
    }
    finish(state, sizeOf(state));
}

void compareTexts(benchmark::State& state) {
    const String text = asciiText(state);
    const String same(text);
    for (auto _ : state)
        benchmark::DoNotOptimize(text == same);
    finish(state, sizeOf(state));
}

BENCHMARK(findUnit)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(findText)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(replaceText)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(trimText)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(appendUnits)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(insertAndRemoveEscapes)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(splitText)->Arg(32)->Arg(256)->Arg(65536);
BENCHMARK(compareTexts)->Arg(32)->Arg(256)->Arg(65536);

}  // namespace

BENCHMARK_MAIN();
