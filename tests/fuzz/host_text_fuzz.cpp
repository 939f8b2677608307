// Request targets, and texts between the code page of tables and the UTF-8 of JSON.

#include <iterator>
#include <nlohmann/json.hpp>

#include "host/tables/code_page.h"
#include "http/url.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

std::string escaped(const std::string& text) {
    constexpr const char* kDigits = "0123456789abcdef";
    std::string out;
    for (const char c : text) {
        const auto value = static_cast<unsigned char>(c);
        out += {'%', kDigits[value >> 4], kDigits[value & 15]};
    }
    return out;
}

void checkTarget(std::string_view text) {
    // Values that hold the character 0 unescaped are refused by the HTTP parser before.
    if (text.find('\0') != std::string_view::npos) return;
    const auto parsed = http::parseTarget(text);
    if (!parsed) return;
    std::string again = escaped(parsed->path);
    char separator = '?';
    for (const auto& [name, value] : parsed->parameters) {
        require((name + value).find('\0') == std::string::npos, "no value has a terminator");
        again += separator + escaped(name) + "=" + escaped(value);
        separator = '&';
    }
    const auto second = http::parseTarget(again);
    require(second.has_value() && second->path == parsed->path &&
                second->parameters == parsed->parameters,
            "what was decoded can be encoded again");
}

void checkCodePage(const host::CodePage& codePage, std::string_view text) {
    const std::string shown = codePage.toUtf8(text);
    require(nlohmann::json::accept(nlohmann::json(shown).dump()), "what is shown is UTF-8");
    const auto local = codePage.fromUtf8(text);
    if (local) require(codePage.toUtf8(*local) == text, "what was converted comes back");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const host::CodePage codePages[] = {
        host::CodePage("UTF-8"), host::CodePage("ISO-8859-1"), host::CodePage("CP1252")};
    fuzz::Input input(data, size);
    const unsigned codePage = input.below(std::size(codePages));
    const std::string_view text = input.rest();
    checkTarget(text);
    checkCodePage(codePages[codePage], text);
    return 0;
}
