// The tokenizers against each other, and command lines cut into arguments. An input is a line with
// the delimiters and the text.

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "base/zavtoken.h"
#include "support/fuzz_support.h"
#include "util/process/report_scan.h"
#include "util/zavprocs.h"

using fuzz::require;
using ZAV::String;

namespace {

/// The longest runs without delimiters.
std::vector<std::u16string> tokensOf(const std::u16string& text, const std::u16string& delimiters) {
    std::vector<std::u16string> tokens;
    for (std::size_t at = 0;;) {
        at = text.find_first_not_of(delimiters, at);
        if (at == std::u16string::npos) return tokens;
        const std::size_t end = std::min(text.find_first_of(delimiters, at), text.size());
        tokens.push_back(text.substr(at, end - at));
        at = end;
    }
}

/// Whether asking for a token throws, as it must when there is none.
bool isExhausted(StringTokenizer& tokenizer) {
    try {
        tokenizer.nextToken();
        return false;
    } catch (const ZAV::IndexOutOfBoundsException&) {
        return true;
    }
}

void checkTokenizers(const String& text, const std::string& delimiters) {
    const String wideDelimiters = fuzz::stringOf(delimiters);
    const auto expected = tokensOf(fuzz::unitsOf(text), fuzz::unitsOf(wideDelimiters));
    StringTokenizer tokenizer(text, wideDelimiters);
    require(tokenizer.countTokens() == static_cast<int>(expected.size()), "tokens are counted");
    for (const std::u16string& token : expected) {
        require(tokenizer.hasMoreTokens(), "there are more tokens");
        require(fuzz::unitsOf(tokenizer.nextToken()) == token, "tokens come in order");
    }
    require(!tokenizer.hasMoreTokens() && tokenizer.countTokens() == 0, "then there are none");
    require(isExhausted(tokenizer), "and asking for one throws");
    if (!fuzz::isAscii(delimiters)) return;
    std::vector<std::u16string> fields;
    for (const String& field : ZAV::splitFields(text, delimiters.c_str()))
        fields.push_back(fuzz::unitsOf(field));
    require(fields == expected, "fields are the same tokens");
}

/// What neither groups nor separates stands in the arguments, in order and once.
std::string bare(const std::string& text) {
    std::string kept;
    char before = '\0';
    for (const char c : text) {
        const bool isQuote = (c == '"' || c == '\'') && before != '\\';
        if (!isQuote && c != ' ') kept += c;
        before = c;
    }
    return kept;
}

void checkArguments(const String& command) {
    char** arguments = nullptr;
    const int count = MakeArgv(&command, &arguments);
    require(count >= 1 && arguments != nullptr, "there is always an argument");
    std::string joined;
    for (int i = 0; i < count; ++i) {
        require(arguments[i] != nullptr, "every argument is a text");
        for (const char* c = arguments[i]; *c != '\0'; ++c) {
            if (*c != ' ') joined += *c;
        }
        std::free(arguments[i]);
    }
    require(arguments[count] == nullptr, "the list ends in a null pointer");
    std::free(arguments);
    const ZAV::CharStar narrow = command.c_str();
    require(bare(static_cast<const char*>(narrow)).rfind(joined, 0) == 0,
            "arguments hold what the command line does");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    std::string delimiters = fuzz::upToZero(input.line());
    if (delimiters.empty()) delimiters = "\n";
    const String text = fuzz::stringOf(input.rest());
    checkTokenizers(text, delimiters);
    checkArguments(text);
    return 0;
}
