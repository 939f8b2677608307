// Property and configuration files against a plain reading of the same bytes. The first byte of an
// input is the comment character.

#include <map>

#include "base/zavrbndl.h"
#include "support/fuzz_support.h"
#include "tasks/ua_files.h"

using fuzz::require;
using namespace ZAV;

namespace {

using Pairs = std::map<std::string, std::string>;

std::string trimmed(const std::string& text) {
    constexpr const char* kBlanks = " \t\n\v\f\r";
    const std::size_t first = text.find_first_not_of(kBlanks);
    if (first == std::string::npos) return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

/// Calls `use` with each line; what ends the last one is the text's end.
template <typename Use>
void forEachLine(const std::string& text, Use use) {
    std::size_t at = 0;
    while (at <= text.size()) {
        const std::size_t end = std::min(text.find('\n', at), text.size());
        use(text.substr(at, end - at));
        at = end + 1;
    }
}

/// What a bundle holds: both sides of the first "=" trimmed, whatever they are.
Pairs bundlePairs(const std::string& text, char comment) {
    Pairs pairs;
    forEachLine(text, [&](const std::string& line) {
        const std::size_t equals = line.find('=');
        if (line[0] == comment || equals == std::string::npos) return;
        pairs[trimmed(line.substr(0, equals))] = trimmed(line.substr(equals + 1));
    });
    return pairs;
}

/// What a configuration holds: lines are trimmed, their sides are not and must not be empty.
Pairs configurationPairs(const std::string& text, char comment) {
    Pairs pairs;
    forEachLine(text, [&](const std::string& whole) {
        const std::string line = trimmed(whole);
        const std::size_t equals = line.find('=');
        if (line[0] == comment || equals == std::string::npos || equals == 0) return;
        if (equals + 1 < line.size()) pairs[line.substr(0, equals)] = line.substr(equals + 1);
    });
    return pairs;
}

std::string withoutZeros(std::string_view text) {
    std::string kept;
    for (const char c : text) {
        if (c != '\0') kept += c;
    }
    return kept;
}

void checkBundle(const String& path, std::string_view content, char comment) {
    const ResourceBundle bundle(path, comment);
    const ResourceBundle copy(bundle);
    const Array<String> keys = bundle.getKeys();
    Pairs found;
    for (std::uint32_t i = 0; i < keys.getSize(); ++i) {
        const String* const value = bundle.getValue(keys[i]);
        require(value != nullptr && copy.getValue(keys[i]) == value, "keys have values");
        fuzz::unitsOf(*value);
        found[fuzz::narrow(keys[i])] = fuzz::narrow(*value);
    }
    if (!fuzz::isAscii(content)) return;
    require(found.size() == keys.getSize(), "each key is there once");
    require(found == bundlePairs(fuzz::upToZero(content), comment), "a bundle holds the pairs");
}

void checkConfiguration(const String& path, std::string_view content, char comment) {
    const StrStrMap map = populateHashMapFromFile(path, comment);
    const Array<String> keys = map.getKeys();
    Pairs found;
    for (std::uint32_t i = 0; i < keys.getSize(); ++i) {
        String value;
        require(map.get(keys[i], value), "keys have values");
        require(keys[i].length() > 0 && value.length() > 0, "no side is empty");
        found[fuzz::narrow(keys[i])] = fuzz::narrow(value);
    }
    if (!fuzz::isAscii(content)) return;
    require(found == configurationPairs(withoutZeros(content), comment),
            "a configuration holds the pairs");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const char comment = static_cast<char>(input.byte() & 0x7F);
    const std::string_view content = input.rest();
    const fuzz::MemoryFile file(content);
    checkBundle(file.path(), content, comment);
    checkConfiguration(file.path(), content, comment);
    return 0;
}
