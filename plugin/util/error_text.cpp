#include "util/error_text.h"

#include <cstring>

namespace ZAV {

std::string errorText(int errnum) {
    char buffer[256] = "";
    return ::strerror_r(errnum, buffer, sizeof buffer);
}

}  // namespace ZAV
