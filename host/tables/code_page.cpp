#include "host/tables/code_page.h"

#include <iconv.h>
#include <langinfo.h>

#include <algorithm>
#include <cerrno>
#include <stdexcept>
#include <utility>

namespace host {
namespace {

constexpr const char* kUtf8 = "UTF-8";
constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

/// One conversion. The C library's converters keep state, so each serves one thread.
class Converter {
public:
    Converter(const char* to, const char* from) : handle_(::iconv_open(to, from)) {}
    ~Converter() {
        if (usable()) ::iconv_close(handle_);
    }
    Converter(const Converter&) = delete;
    Converter& operator=(const Converter&) = delete;

    bool usable() const {
        return handle_ != reinterpret_cast<iconv_t>(-1);  // NOLINT: iconv's own error value
    }

    /// Converts `text` and removes from its front what was converted. Returns 0, or why it stopped:
    /// EILSEQ (no such character) or EINVAL (the last character is incomplete).
    int run(std::string_view& text, std::string& out) const {
        while (true) {
            char piece[512];
            char* from = const_cast<char*>(text.data());  // NOLINT: iconv only reads it
            std::size_t left = text.size();
            char* to = piece;
            std::size_t room = sizeof piece;
            const std::size_t done = ::iconv(handle_, &from, &left, &to, &room);
            const int error = done == static_cast<std::size_t>(-1) ? errno : 0;
            out.append(piece, sizeof piece - room);
            text.remove_prefix(text.size() - left);
            if (error != E2BIG) return error;
        }
    }

    /// Appends the bytes that bring a stateful code page back to its initial state.
    void finish(std::string& out) const {
        char piece[16];
        char* to = piece;
        std::size_t room = sizeof piece;
        ::iconv(handle_, nullptr, nullptr, &to, &room);
        out.append(piece, sizeof piece - room);
    }

private:
    iconv_t handle_;
};

/// Control characters are left out: some are the escapes of stateful code pages.
bool isPlain(char c) {
    return c >= ' ' && c <= '~';
}

bool isPlain(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char c) { return isPlain(c); });
}

/// The position of the first sequence that encodes a number beyond Unicode, or the text's length.
/// The C library's converters take such sequences, up to six bytes long, for characters.
std::size_t startBeyondUnicode(std::string_view text) {
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto lead = static_cast<unsigned char>(text[i]);
        if (lead < 0xF4) continue;
        const auto next = static_cast<unsigned char>(i + 1 < text.size() ? text[i + 1] : 0);
        if (lead > 0xF4 || next >= 0x90) return i;
    }
    return text.size();
}

/// Appends the whole text. The replacement character stands for each byte that belongs to no
/// character, and for a sequence that is cut at the end.
void appendMended(const Converter& converter, std::string_view text, std::string& out) {
    while (const int error = converter.run(text, out)) {
        out += kReplacement;
        text.remove_prefix(error == EINVAL ? text.size() : 1);
    }
}

/// Whether a conversion leaves plain texts as they are.
bool keepsPlain(const char* to, const char* from) {
    std::string plain;
    for (char c = ' '; isPlain(c); ++c)
        plain += c;
    std::string_view rest = plain;
    std::string out;
    return Converter(to, from).run(rest, out) == 0 && out == plain;
}

}  // namespace

CodePage::CodePage(std::string name) : name_(std::move(name)) {
    if (!Converter(kUtf8, name_.c_str()).usable() || !Converter(name_.c_str(), kUtf8).usable()) {
        throw std::runtime_error("the C library has no converter for the code page " + name_);
    }
    keepsPlain_ = keepsPlain(kUtf8, name_.c_str()) && keepsPlain(name_.c_str(), kUtf8);
}

CodePage CodePage::ofProcess() {
    return CodePage(::nl_langinfo(CODESET));
}

std::string CodePage::toUtf8(std::string_view text) const {
    if (keepsPlain_ && isPlain(text)) return std::string(text);
    const Converter converter(kUtf8, name_.c_str());
    std::string out;
    out.reserve(text.size());
    while (name_ == kUtf8) {
        const std::size_t end = startBeyondUnicode(text);
        if (end == text.size()) break;
        appendMended(converter, text.substr(0, end), out);
        out += kReplacement;
        text.remove_prefix(end + 1);
    }
    appendMended(converter, text, out);
    return out;
}

std::optional<std::string> CodePage::fromUtf8(std::string_view text) const {
    if (keepsPlain_ && isPlain(text)) return std::string(text);
    if (startBeyondUnicode(text) != text.size()) return std::nullopt;
    const Converter converter(name_.c_str(), kUtf8);
    std::string out;
    out.reserve(text.size());
    if (converter.run(text, out) != 0) return std::nullopt;
    converter.finish(out);
    return out;
}

}  // namespace host
