#include "base/zavarryi.h"

#include <cstdio>
#include <stdexcept>

namespace ZAV {

void throwArrayIndexError(int line) {
    constexpr const char* kUnit = "zavarryi";
    std::printf("IndexOutOfBoundsException %s:%d\n", kUnit, line);
    throw IndexOutOfBoundsException(line, kUnit);
}

void throwArrayTooLong() {
    throw std::length_error("ZAV::Array");
}

}  // namespace ZAV
