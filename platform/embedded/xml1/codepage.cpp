#include "xml1/codepage.h"

#include <iconv.h>

#include <array>
#include <cstddef>
#include <cstring>
#include <new>

#include "common/utf16.h"

namespace xml1 {
namespace {

constexpr int kAscii = 367;
constexpr int kNoCharacter = -1;

DefaultLocale openDefaultLocale() {
    int status = NLS2_OK;
    return DefaultLocale(NLS2_GetLocale(NLS2_BY_DEFAULT, 0, 0, &status));
}

/// Turns the bytes of one character of an encoding into its code point.
class Decoder {
public:
    virtual ~Decoder() = default;
    /// The code point, or kNoCharacter when the bytes are not exactly one character.
    virtual int decode(const char* bytes, std::size_t count) = 0;
};

class LocalDecoder final : public Decoder {
public:
    int decode(const char* bytes, std::size_t count) override {
        unsigned short units[2] = {};
        int status = NLS2_OK;
        const unsigned written =
            NLS2_toUTF16(locale_.get(), bytes, static_cast<unsigned>(count), units, 2, &status);
        return status == NLS2_OK && written == 1 ? units[0] : kNoCharacter;
    }

private:
    const DefaultLocale locale_ = openDefaultLocale();
};

class IconvDecoder final : public Decoder {
public:
    explicit IconvDecoder(const char* encoding) : converter_(::iconv_open("WCHAR_T", encoding)) {}
    ~IconvDecoder() override {
        if (usable()) ::iconv_close(converter_);
    }
    IconvDecoder(const IconvDecoder&) = delete;
    IconvDecoder& operator=(const IconvDecoder&) = delete;

    bool usable() const { return converter_ != reinterpret_cast<iconv_t>(-1); }

    int decode(const char* bytes, std::size_t count) override {
        ::iconv(converter_, nullptr, nullptr, nullptr, nullptr);
        std::array<wchar_t, 2> wide{};
        char* in = const_cast<char*>(bytes);
        char* out = reinterpret_cast<char*>(wide.data());
        std::size_t room = sizeof wide;
        const std::size_t result = ::iconv(converter_, &in, &count, &out, &room);
        const bool isOne = result == 0 && count == 0 && room == sizeof(wchar_t);
        return isOne ? static_cast<int>(wide[0]) : kNoCharacter;
    }

private:
    const iconv_t converter_;
};

std::unique_ptr<Decoder> decoderNamed(const char* name) {
    if (std::strcmp(name, kLocalEncoding) == 0) return std::make_unique<LocalDecoder>();
    auto decoder = std::make_unique<IconvDecoder>(name);
    if (!decoder->usable()) return nullptr;
    return decoder;
}

/// Whether some byte after `lead` completes a character.
bool leadsTwo(Decoder& decoder, char lead) {
    for (int second = 0x40; second <= 0xFE; ++second) {
        const char bytes[2] = {lead, static_cast<char>(second)};
        if (decoder.decode(bytes, 2) != kNoCharacter) return true;
    }
    return false;
}

bool leadsThree(Decoder& decoder, char lead) {
    for (int second = 0xA1; second <= 0xFE; ++second) {
        for (int third = 0xA1; third <= 0xFE; ++third) {
            const char bytes[3] = {lead, static_cast<char>(second), static_cast<char>(third)};
            if (decoder.decode(bytes, 3) != kNoCharacter) return true;
        }
    }
    return false;
}

/// A byte's entry in expat's table: the character that it is, or minus the length of the characters
/// that it begins, or -1 when it begins none.
int meaningOf(Decoder& decoder, int byte) {
    const char lead = static_cast<char>(byte);
    const int character = decoder.decode(&lead, 1);
    if (character != kNoCharacter) return character;
    if (byte < 0x80) return -1;
    if (leadsTwo(decoder, lead)) return -2;
    // Only EUC encodings have characters of three bytes; they begin with a single shift.
    const bool isSingleShift = byte == 0x8E || byte == 0x8F;
    return isSingleShift && leadsThree(decoder, lead) ? -3 : -1;
}

/// What convertCharacter needs; expat frees it with the parser.
struct Reading {
    std::unique_ptr<Decoder> decoder;
    std::array<int, 256> meanings;
};

int convertCharacter(void* data, const char* bytes) {
    Reading& reading = *static_cast<Reading*>(data);
    const int meaning = reading.meanings[static_cast<unsigned char>(*bytes)];
    return reading.decoder->decode(bytes, static_cast<std::size_t>(-meaning));
}

void release(void* data) {
    const std::unique_ptr<Reading> reading(static_cast<Reading*>(data));
}

/// Appends well-formed UTF-8 as UTF-16.
void appendWide(std::string_view utf8, std::vector<unsigned short>& out) {
    for (std::size_t at = 0; at < utf8.size();) {
        const unsigned lead = static_cast<unsigned char>(utf8[at]);
        const std::size_t length = lead < 0x80 ? 1 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
        if (length > utf8.size() - at) return;
        unsigned point = length == 1 ? lead : lead & (0x7FU >> length);
        for (std::size_t i = 1; i < length; ++i) {
            point = point << 6 | (static_cast<unsigned char>(utf8[at + i]) & 0x3FU);
        }
        unsigned short units[2];
        out.insert(out.end(), units, units + utf16::put(point, units));
        at += length;
    }
}

bool isAscii(std::string_view text) {
    unsigned bits = 0;
    for (const char c : text)
        bits |= static_cast<unsigned char>(c);
    return bits < 0x80;
}

/// Whether every ASCII character is its own byte in the locale's code page.
bool keepsAscii(NLS2_LOCALE* locale) {
    std::array<unsigned short, 128> units;
    std::array<char, 128> expected;
    std::array<char, 128> bytes{};
    for (unsigned i = 0; i < units.size(); ++i) {
        units[i] = static_cast<unsigned short>(i);
        expected[i] = static_cast<char>(i);
    }
    int status = NLS2_OK;
    const unsigned written =
        NLS2_fromUTF16(locale, units.data(), units.size(), bytes.data(), bytes.size(), &status);
    return written == units.size() && bytes == expected;
}

}  // namespace

LocalText::LocalText() : locale_(openDefaultLocale()) {
    int status = NLS2_OK;
    if (!locale_) return;
    codepage_ = NLS2_GetLocaleCodepageId(locale_.get(), &status);
    keepsAscii_ = keepsAscii(locale_.get());
}

bool LocalText::readsItself() const {
    return codepage_ != NLS2_CP_UTF8 && codepage_ != kAscii;
}

void LocalText::append(std::string_view utf8, std::string& out) {
    if (keepsAscii_ && isAscii(utf8)) {
        out.append(utf8);
        return;
    }
    wide_.clear();
    appendWide(utf8, wide_);
    const std::size_t before = out.size();
    constexpr std::size_t kMostBytesPerUnit = 4;
    out.resize(before + wide_.size() * kMostBytesPerUnit);
    int status = NLS2_OK;
    const unsigned written =
        NLS2_fromUTF16(locale_.get(), wide_.data(), static_cast<unsigned>(wide_.size()),
                       &out[before], static_cast<unsigned>(out.size() - before), &status);
    out.resize(before + written);
}

int describeEncoding(void*, const XML_Char* name, XML_Encoding* encoding) {
    try {
        auto reading = std::make_unique<Reading>();
        reading->decoder = decoderNamed(name);
        if (!reading->decoder) return XML_STATUS_ERROR;
        for (int byte = 0; byte < 256; ++byte) {
            reading->meanings[static_cast<std::size_t>(byte)] = meaningOf(*reading->decoder, byte);
            encoding->map[byte] = reading->meanings[static_cast<std::size_t>(byte)];
        }
        encoding->convert = convertCharacter;
        encoding->release = release;
        encoding->data = reading.release();
        return XML_STATUS_OK;
    } catch (const std::bad_alloc&) {
        return XML_STATUS_ERROR;
    }
}

}  // namespace xml1
