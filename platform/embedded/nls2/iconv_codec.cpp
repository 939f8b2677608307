// Code pages by the C library's converters.

#include <iconv.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <optional>

#include "common/utf16.h"
#include "nls2/ascii.h"
#include "nls2/locale.h"

namespace nls2 {
namespace {

constexpr const char* kUtf16 = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__ ? "UTF-16LE" : "UTF-16BE";

bool isOpen(iconv_t descriptor) {
    return descriptor != iconv_t{} && descriptor != reinterpret_cast<iconv_t>(-1);
}

/// Opened descriptors of one direction. Opening one takes far longer than converting a text, so
/// those not in use are kept; taking and giving back costs one atomic operation each.
class DescriptorPool {
public:
    DescriptorPool(const char* to, const char* from) : to_(to), from_(from) {}
    ~DescriptorPool() {
        for (const std::atomic<iconv_t>& slot : idle_) {
            if (isOpen(slot)) ::iconv_close(slot);
        }
    }
    DescriptorPool(const DescriptorPool&) = delete;
    DescriptorPool& operator=(const DescriptorPool&) = delete;

    /// Exclusive use of a descriptor in its initial state.
    class Lease {
    public:
        explicit Lease(DescriptorPool& pool) : pool_(pool), descriptor_(pool.take()) {}
        ~Lease() { pool_.giveBack(descriptor_); }
        Lease(const Lease&) = delete;
        Lease& operator=(const Lease&) = delete;
        bool valid() const { return isOpen(descriptor_); }
        iconv_t get() const { return descriptor_; }

    private:
        DescriptorPool& pool_;
        iconv_t descriptor_;
    };

private:
    iconv_t take() {
        for (std::atomic<iconv_t>& slot : idle_) {
            const iconv_t found = slot.exchange(iconv_t{}, std::memory_order_acquire);
            if (found != iconv_t{}) return found;
        }
        return ::iconv_open(to_, from_);
    }

    void giveBack(iconv_t descriptor) {
        if (!isOpen(descriptor)) return;
        ::iconv(descriptor, nullptr, nullptr, nullptr, nullptr);
        for (std::atomic<iconv_t>& slot : idle_) {
            iconv_t empty{};
            if (slot.compare_exchange_strong(empty, descriptor, std::memory_order_release,
                                             std::memory_order_relaxed)) {
                return;
            }
        }
        ::iconv_close(descriptor);
    }

    const char* to_;
    const char* from_;
    std::array<std::atomic<iconv_t>, 8> idle_{};
};

using Lease = DescriptorPool::Lease;

/// Some converters hold a character back for a combining mark to come: writes it, and takes the
/// descriptor back to its initial state. False when the output has no room for it.
bool flush(const Lease& lease, char*& out, std::size_t& outLeft) {
    return ::iconv(lease.get(), nullptr, nullptr, &out, &outLeft) != static_cast<std::size_t>(-1);
}

/// What a single byte is in a code page.
struct ByteMeaning {
    enum Kind { Character, None, BeginsCharacter } kind;
    unsigned short unit;
};

ByteMeaning meaningOf(const Lease& toUnits, unsigned byte) {
    char input = static_cast<char>(byte);
    char* in = &input;
    std::size_t inLeft = 1;
    unsigned short units[4] = {};
    char* out = reinterpret_cast<char*>(units);
    std::size_t outLeft = sizeof units;
    const std::size_t failed = ::iconv(toUnits.get(), &in, &inLeft, &out, &outLeft);
    const int error = failed == static_cast<std::size_t>(-1) ? errno : 0;
    flush(toUnits, out, outLeft);
    if (error == EINVAL) return {ByteMeaning::BeginsCharacter, 0};
    if (error != 0 || sizeof units - outLeft != sizeof units[0]) return {ByteMeaning::None, 0};
    return {ByteMeaning::Character, units[0]};
}

/// Whether the code page gives every ASCII character its own byte.
bool keepsAscii(const Lease& fromUnits) {
    for (unsigned short unit = 0; unit < 0x80; ++unit) {
        unsigned short input = unit;
        char* in = reinterpret_cast<char*>(&input);
        std::size_t inLeft = sizeof input;
        char bytes[8];
        char* out = bytes;
        std::size_t outLeft = sizeof bytes;
        const std::size_t failed = ::iconv(fromUnits.get(), &in, &inLeft, &out, &outLeft);
        ::iconv(fromUnits.get(), nullptr, nullptr, nullptr, nullptr);
        if (failed != 0 || out != bytes + 1 || bytes[0] != static_cast<char>(unit)) return false;
    }
    return true;
}

class IconvLocale : public NLS2_LOCALE {
public:
    IconvLocale(int number, const char* name)
        : NLS2_LOCALE(number), toUnits_(kUtf16, name), fromUnits_(name, kUtf16) {}

    bool usable() const { return Lease(toUnits_).valid() && Lease(fromUnits_).valid(); }

    /// What each byte is by itself; nothing when some begin longer characters. Notes on the way
    /// whether ASCII needs no converter.
    std::optional<std::array<unsigned short, 256>> singleByteTable() {
        const Lease toUnits(toUnits_);
        std::array<unsigned short, 256> units{};
        bool single = true;
        widensAscii_ = true;
        for (unsigned byte = 0; byte < 256; ++byte) {
            const ByteMeaning meaning = meaningOf(toUnits, byte);
            single = single && meaning.kind != ByteMeaning::BeginsCharacter;
            units[byte] = meaning.kind == ByteMeaning::Character ? meaning.unit : kReplacementUnit;
            if (byte < 0x80 && units[byte] != byte) widensAscii_ = false;
        }
        narrowsAscii_ = keepsAscii(Lease(fromUnits_));
        if (!single) return std::nullopt;
        return units;
    }

    Conversion toUTF16(const char* text, unsigned length, unsigned short* out,
                       unsigned capacity) const override {
        // A trail byte may look like ASCII, so only what precedes the first other byte is safe.
        const unsigned ascii = widensAscii_ ? widenAscii(text, std::min(length, capacity), out) : 0;
        if (ascii == length) return {ascii, NLS2_OK};
        if (ascii == capacity) return {ascii, NLS2_TRUNCATED};
        const Lease lease(toUnits_);
        if (!lease.valid()) return {ascii, NLS2_NO_LOCALE};
        char* in = const_cast<char*>(text) + ascii;
        std::size_t inLeft = length - ascii;
        char* to = reinterpret_cast<char*>(out + ascii);
        std::size_t outLeft = std::size_t{capacity - ascii} * sizeof *out;
        int status = NLS2_OK;
        while (inLeft > 0 && status != NLS2_TRUNCATED) {
            const std::size_t replaced = ::iconv(lease.get(), &in, &inLeft, &to, &outLeft);
            if (replaced != static_cast<std::size_t>(-1)) {
                if (replaced > 0) status = NLS2_SUBSTITUTED;
            } else if (errno == E2BIG || outLeft < sizeof *out) {
                status = NLS2_TRUNCATED;
            } else {
                // One byte at a time, also of a character that the text ends within: what follows,
                // the terminator at least, may be a character of its own.
                std::memcpy(to, &kReplacementUnit, sizeof kReplacementUnit);
                to += sizeof kReplacementUnit;
                outLeft -= sizeof kReplacementUnit;
                ++in;
                --inLeft;
                status = NLS2_SUBSTITUTED;
            }
        }
        if (!flush(lease, to, outLeft)) status = NLS2_TRUNCATED;
        return {capacity - static_cast<unsigned>(outLeft / sizeof *out), status};
    }

    Conversion fromUTF16(const unsigned short* text, unsigned length, char* out,
                         unsigned capacity) const override {
        const unsigned ascii =
            narrowsAscii_ ? narrowAscii(text, std::min(length, capacity), out) : 0;
        if (ascii == length) return {ascii, NLS2_OK};
        if (ascii == capacity) return {ascii, NLS2_TRUNCATED};
        const Lease lease(fromUnits_);
        if (!lease.valid()) return {ascii, NLS2_NO_LOCALE};
        char* in = reinterpret_cast<char*>(const_cast<unsigned short*>(text + ascii));
        std::size_t inLeft = std::size_t{length - ascii} * sizeof *text;
        char* to = out + ascii;
        std::size_t outLeft = capacity - ascii;
        int status = NLS2_OK;
        while (inLeft > 0 && status != NLS2_TRUNCATED) {
            const std::size_t replaced = ::iconv(lease.get(), &in, &inLeft, &to, &outLeft);
            if (replaced != static_cast<std::size_t>(-1)) {
                if (replaced > 0) status = NLS2_SUBSTITUTED;
            } else if (errno == E2BIG || outLeft == 0) {
                status = NLS2_TRUNCATED;
            } else {
                const auto left = static_cast<unsigned>(inLeft / sizeof *text);
                const std::size_t skipped =
                    utf16::take(text + (length - left), left).units * sizeof *text;
                *to++ = kReplacementByte;
                --outLeft;
                in += skipped;
                inLeft -= skipped;
                status = NLS2_SUBSTITUTED;
            }
        }
        if (!flush(lease, to, outLeft)) status = NLS2_TRUNCATED;
        return {capacity - static_cast<unsigned>(outLeft), status};
    }

private:
    mutable DescriptorPool toUnits_;
    mutable DescriptorPool fromUnits_;
    bool widensAscii_ = false;
    bool narrowsAscii_ = false;
};

}  // namespace

std::unique_ptr<NLS2_LOCALE> makeIconvLocale(const CodePage& page) {
    auto locale = std::make_unique<IconvLocale>(page.number, page.iconvName);
    if (!locale->usable()) return nullptr;
    if (const auto units = locale->singleByteTable()) {
        return makeSingleByteLocale(page.number, units->data());
    }
    return locale;
}

}  // namespace nls2
