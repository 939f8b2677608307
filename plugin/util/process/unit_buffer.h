/// Collects UTF-16 units piece by piece.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <stdexcept>
#include <utility>

#include "base/zavstr.h"

namespace ZAV {

/// Doubles its capacity when it is full, where a String would copy its whole text more often. It
/// uses realloc, which for large blocks remaps pages rather than copying bytes.
class UnitBuffer {
public:
    void append(const String& piece) {
        const std::size_t count = piece.length();
        if (size_ + count >= String::NPOS) throw std::length_error("more than a String holds");
        if (size_ + count > room_) grow(size_ + count);
        if (count != 0) std::memcpy(units_.get() + size_, piece.getData(), count * kUnit);
        size_ += count;
    }

    void appendTo(String& text) const {
        if (size_ == 0) return;
        String collected;
        collected.assign(units_.get(), static_cast<std::uint32_t>(size_));
        if (text.length() == 0) {
            text = std::move(collected);
        } else {
            text.append(collected);
        }
    }

private:
    static constexpr std::size_t kUnit = sizeof(unsigned short);
    static constexpr std::size_t kFirstRoom = 1024;

    struct Freed {
        void operator()(void* block) const { std::free(block); }
    };

    void grow(std::size_t needed) {
        const std::size_t room = std::max({needed, 2 * room_, kFirstRoom});
        if (room > SIZE_MAX / kUnit) throw std::bad_alloc();
        void* const block = std::realloc(units_.get(), room * kUnit);
        if (block == nullptr) throw std::bad_alloc();
        (void)units_.release();  // realloc has taken it over
        units_.reset(static_cast<unsigned short*>(block));
        room_ = room;
    }

    std::unique_ptr<unsigned short, Freed> units_;
    std::size_t size_ = 0;
    std::size_t room_ = 0;
};

}  // namespace ZAV
