/// What the fuzz targets share: expectations, the reading of an input's fields, and files in
/// memory.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "base/zavstr.h"

namespace fuzz {

/// Ends the process, and so the run, when an expectation does not hold; says which and where.
void require(bool holds, const char* expectation, const char* file = __builtin_FILE(),
             int line = __builtin_LINE());

/// Takes fields off the front of an input, so that an input can be read and written by hand. Fields
/// that are missing are zeros and empty texts. Borrows the bytes.
class Input {
public:
    Input(const std::uint8_t* data, std::size_t size)
        : rest_(reinterpret_cast<const char*>(data), size) {}

    bool isEmpty() const { return rest_.empty(); }
    std::uint8_t byte();
    /// A number less than `bound`, which is at most 256, from one byte.
    unsigned below(unsigned bound) { return byte() % bound; }
    /// As many bytes as there are, up to `count`.
    std::string_view bytes(std::size_t count);
    /// What stands before the next line feed, which is taken too.
    std::string_view line();
    std::string_view rest();
    /// A short text: its length modulo `bound` and a byte for each unit. Bytes of ASCII stand for
    /// themselves, the others for units that are treated specially somewhere.
    std::u16string units(unsigned bound);
    /// One such unit.
    char16_t unit();

private:
    std::string_view rest_;
};

bool isAscii(std::string_view text);
/// The text as far as its first 0.
std::string upToZero(std::string_view text);

/// The text's units; requires that they end in exactly one terminator.
std::u16string unitsOf(const ZAV::String& text);
ZAV::String stringOf(std::u16string_view units);
/// From text in the code page of the process, without zeros.
ZAV::String stringOf(std::string_view text);
/// The same for units all of which are ASCII.
std::string narrow(const ZAV::String& text);

/// A file that takes no place in a file system.
class MemoryFile {
public:
    explicit MemoryFile(std::string_view content);
    ~MemoryFile();
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;

    /// A name under which it can be opened, by this process.
    ZAV::String path() const;

private:
    int descriptor_;
};

}  // namespace fuzz
