#include "support/fuzz_support.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <iterator>

#include "embedded/ras1_control.h"

namespace fuzz {
namespace {

/// A terminator in the midst, blanks of two kinds, letters whose cases differ in length or plane, a
/// surrogate pair and halves of others, and the units that conversions put in or take out.
constexpr char16_t kSpecialUnits[] = {0,      0x85,   0xA0,   0xDF,   0xE9,   0x130,  0x131,
                                      0x3000, 0x2028, 0xD83D, 0xDE00, 0xFEFF, 0xFFFD, 0xFFFF};

}  // namespace

void require(bool holds, const char* expectation, const char* file, int line) {
    if (holds) return;
    std::fprintf(stderr, "%s:%d: expected: %s\n", file, line, expectation);
    std::abort();
}

std::uint8_t Input::byte() {
    if (rest_.empty()) return 0;
    const auto first = static_cast<std::uint8_t>(rest_.front());
    rest_.remove_prefix(1);
    return first;
}

std::string_view Input::bytes(std::size_t count) {
    const std::string_view taken = rest_.substr(0, count);
    rest_.remove_prefix(taken.size());
    return taken;
}

std::string_view Input::line() {
    const std::string_view taken = rest_.substr(0, rest_.find('\n'));
    rest_.remove_prefix(std::min(taken.size() + 1, rest_.size()));
    return taken;
}

std::string_view Input::rest() {
    return bytes(rest_.size());
}

char16_t Input::unit() {
    const std::uint8_t value = byte();
    return value < 0x80 ? value : kSpecialUnits[value % std::size(kSpecialUnits)];
}

std::u16string Input::units(unsigned bound) {
    std::u16string taken;
    for (unsigned left = below(bound); left > 0; --left)
        taken += unit();
    return taken;
}

bool isAscii(std::string_view text) {
    return std::all_of(text.begin(), text.end(),
                       [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

std::string upToZero(std::string_view text) {
    return std::string(text.substr(0, text.find('\0')));
}

std::u16string unitsOf(const ZAV::String& text) {
    const unsigned short* const units = text.getData();
    require(units[text.length()] == 0, "a text's units end in a terminator");
    return std::u16string(units, units + text.length());
}

ZAV::String stringOf(std::u16string_view units) {
    ZAV::String text;
    const std::basic_string<unsigned short> copy(units.begin(), units.end());
    text.assign(copy.data(), static_cast<std::uint32_t>(copy.size()));
    return text;
}

ZAV::String stringOf(std::string_view text) {
    return ZAV::String(std::string(text).c_str());
}

std::string narrow(const ZAV::String& text) {
    std::string narrowed;
    for (const char16_t unit : unitsOf(text))
        narrowed += static_cast<char>(unit);
    return narrowed;
}

MemoryFile::MemoryFile(std::string_view content)
    : descriptor_(::memfd_create("fuzz", MFD_CLOEXEC)) {
    require(descriptor_ >= 0, "a file in memory can be made");
    while (!content.empty()) {
        const ssize_t written = ::write(descriptor_, content.data(), content.size());
        require(written > 0, "a file in memory takes its content");
        content.remove_prefix(static_cast<std::size_t>(written));
    }
}

MemoryFile::~MemoryFile() {
    ::close(descriptor_);
}

ZAV::String MemoryFile::path() const {
    return ZAV::String(("/proc/self/fd/" + std::to_string(descriptor_)).c_str());
}

}  // namespace fuzz

/// Called once by the fuzzer. Traces are made, because inputs reach them too, and thrown away.
extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
    // The environment decides only where the process's locale says nothing: then it says nothing
    // too.
    ::setenv("LC_ALL", "C", 1);
    fuzz::require(std::setlocale(LC_ALL, "C.UTF-8") != nullptr, "there is a UTF-8 locale");
    ras1::configure("DETAIL", "/dev/null");
    return 0;
}
