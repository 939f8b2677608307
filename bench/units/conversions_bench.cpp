// Text from and to the code page, beside bare iconv with a kept descriptor and ICU's converter.
//
// Every conversion of this library makes its owned result; the others are given their buffers, so
// their figures are those of the conversion alone.

#include <benchmark/benchmark.h>
#include <iconv.h>
#ifdef ZAV_BENCH_ICU
#include <unicode/ucnv.h>
#endif

#include <cstdlib>
#include <stdexcept>
#include <string>
#include <vector>

#include "base/zavstr.h"

using ZAV::CharStar;
using ZAV::String;

namespace {

/// A code page and a text in it.
struct Kind {
    const char* name;
    const char* codeset;
    const char* locale;   ///< a process's locale that has this code page
    const char* pattern;  ///< what the text consists of
    bool cut;             ///< at any byte, as each is a character
};

constexpr const char* kAscii = "The quick brown fox, 0123456789 ";
constexpr Kind kKinds[] = {
    {"utf8_ascii", "UTF-8", "C.UTF-8", kAscii, true},
    {"utf8_mixed", "UTF-8", "C.UTF-8",
     "Gr\xC3\xB6\xC3\x9F"
     "e \xE2\x82\xAC 12, ",
     false},
    // Latin, Greek, Cyrillic, Hebrew, Japanese, Korean and a character beyond 16 bits.
    {"utf8_scripts", "UTF-8", "C.UTF-8",
     "\u00E9t\u00E9, \u03A9\u03BC\u03AD\u03B3\u03B1, \u0440\u0430\u0437\u043C\u0435\u0440, "
     "\u05E9\u05DC\u05D5\u05DD, \u30B5\u30A4\u30BA 12, \uD06C\uAE30, \U0001F600; ",
     false},
    {"latin1_ascii", "ISO-8859-1", "C", kAscii, true},
    {"latin1_mixed", "ISO-8859-1", "C",
     "Gr\xF6\xDF"
     "e \xA3 12, ",
     true},
};

/// `size` bytes of that kind, or a few more where a character would be cut.
std::string sample(const Kind& kind, std::size_t size) {
    std::string text;
    while (text.size() < size)
        text += kind.pattern;
    if (kind.cut) text.resize(size);
    return text;
}

/// The same text in this library's form.
String wideSample(const Kind& kind, std::size_t size) {
    ::setenv("LC_ALL", kind.locale, 1);
    String::initialize();
    return String(sample(kind, size).c_str());
}

class Iconv {
public:
    Iconv(const char* to, const char* from) : descriptor_(::iconv_open(to, from)) {
        if (descriptor_ == reinterpret_cast<iconv_t>(-1)) throw std::runtime_error("no converter");
    }
    ~Iconv() { ::iconv_close(descriptor_); }
    Iconv(const Iconv&) = delete;
    Iconv& operator=(const Iconv&) = delete;

    void convert(const char* text, std::size_t length, char* out, std::size_t room) {
        char* in = const_cast<char*>(text);
        ::iconv(descriptor_, nullptr, nullptr, nullptr, nullptr);
        benchmark::DoNotOptimize(::iconv(descriptor_, &in, &length, &out, &room));
        benchmark::ClobberMemory();
    }

private:
    iconv_t descriptor_;
};

void stringFrom(benchmark::State& state, const Kind& kind, std::size_t size) {
    wideSample(kind, size);
    const std::string text = sample(kind, size);
    for (auto _ : state) {
        const String converted(text.c_str());
        benchmark::DoNotOptimize(converted.getData());
    }
}

void stringTo(benchmark::State& state, const Kind& kind, std::size_t size) {
    const String wide = wideSample(kind, size);
    for (auto _ : state) {
        const CharStar converted = wide.c_str();
        benchmark::DoNotOptimize(static_cast<const char*>(converted));
    }
}

void iconvFrom(benchmark::State& state, const Kind& kind, std::size_t size) {
    const std::string text = sample(kind, size);
    Iconv iconv("UTF-16LE", kind.codeset);
    std::vector<char> out(text.size() * 2 + 2);
    for (auto _ : state)
        iconv.convert(text.c_str(), text.size() + 1, out.data(), out.size());
}

void iconvTo(benchmark::State& state, const Kind& kind, std::size_t size) {
    const String wide = wideSample(kind, size);
    Iconv iconv(kind.codeset, "UTF-16LE");
    // The room that c_str() has, so that both cut the text at the same place.
    std::vector<char> out(wide.length() + 1);
    for (auto _ : state) {
        iconv.convert(reinterpret_cast<const char*>(wide.getData()), out.size() * 2, out.data(),
                      out.size());
    }
}

#ifdef ZAV_BENCH_ICU
class IcuConverter {
public:
    explicit IcuConverter(const char* codeset) {
        UErrorCode error = U_ZERO_ERROR;
        converter_ = ::ucnv_open(codeset, &error);
        if (U_FAILURE(error)) throw std::runtime_error("no converter");
    }
    ~IcuConverter() { ::ucnv_close(converter_); }
    IcuConverter(const IcuConverter&) = delete;
    IcuConverter& operator=(const IcuConverter&) = delete;

    UConverter* get() const { return converter_; }

private:
    UConverter* converter_ = nullptr;
};

void icuFrom(benchmark::State& state, const Kind& kind, std::size_t size) {
    const std::string text = sample(kind, size);
    const IcuConverter converter(kind.codeset);
    std::vector<UChar> out(text.size() + 1);
    for (auto _ : state) {
        UErrorCode error = U_ZERO_ERROR;
        benchmark::DoNotOptimize(::ucnv_toUChars(converter.get(), out.data(),
                                                 static_cast<int32_t>(out.size()), text.c_str(),
                                                 static_cast<int32_t>(text.size()), &error));
        benchmark::ClobberMemory();
    }
}

void icuTo(benchmark::State& state, const Kind& kind, std::size_t size) {
    const String wide = wideSample(kind, size);
    const IcuConverter converter(kind.codeset);
    std::vector<char> out(wide.length() + 1);
    for (auto _ : state) {
        UErrorCode error = U_ZERO_ERROR;
        benchmark::DoNotOptimize(::ucnv_fromUChars(converter.get(), out.data(),
                                                   static_cast<int32_t>(out.size()),
                                                   reinterpret_cast<const UChar*>(wide.getData()),
                                                   static_cast<int32_t>(wide.length()), &error));
        benchmark::ClobberMemory();
    }
}
#endif

using Conversion = void (*)(benchmark::State&, const Kind&, std::size_t);

void add(const std::string& direction, const std::string& way, Conversion convert) {
    for (const Kind& kind : kKinds) {
        for (const std::size_t size : {std::size_t{32}, std::size_t{256}, std::size_t{65536}}) {
            const std::string name =
                direction + '/' + kind.name + '/' + std::to_string(size) + '/' + way;
            benchmark::RegisterBenchmark(
                name.c_str(), [=](benchmark::State& state) { convert(state, kind, size); });
        }
    }
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    add("from", "string", stringFrom);
    add("from", "iconv", iconvFrom);
    add("to", "string", stringTo);
    add("to", "iconv", iconvTo);
#ifdef ZAV_BENCH_ICU
    add("from", "icu", icuFrom);
    add("to", "icu", icuTo);
#endif
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
