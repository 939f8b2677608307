#include "util/exceptions.h"

#include <exception>

#include "base/zavindex.h"

namespace ZAV {

const char* currentExceptionText() noexcept {
    try {
        throw;
    } catch (const std::exception& exception) {
        return exception.what();
    } catch (const IndexOutOfBoundsException& exception) {
        return exception.getErrorMessage();
    } catch (...) {
        return "an exception without a text";
    }
}

void traceException(const Trace& trace) noexcept {
    trace().error("Exception caught: %s", currentExceptionText());
}

}  // namespace ZAV
