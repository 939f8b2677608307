#include "base/zavindex.h"

#include <cstdio>

namespace ZAV {

IndexOutOfBoundsException::IndexOutOfBoundsException(int line, const char* file) {
    std::snprintf(message_, sizeof message_, "line: %d, file: %s", line, file);
}

}  // namespace ZAV
