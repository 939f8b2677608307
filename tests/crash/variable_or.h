/// Numbers that whoever runs these tests by hand may choose.
#pragma once

#include <cstdlib>

/// The variable's number; `otherwise` if it is not set.
inline unsigned variableOr(const char* name, unsigned otherwise) {
    const char* const value = std::getenv(name);
    return value == nullptr ? otherwise : static_cast<unsigned>(std::strtoul(value, nullptr, 10));
}
