/// Exceptions that end here, because they must not reach threads or callers that know none.
#pragma once

#include "base/zavtrace.h"

namespace ZAV {

/// The text of the exception that is being handled; called in a catch block only, and valid until
/// its end.
const char* currentExceptionText() noexcept;

/// Traces the exception that is being handled, if there is memory for that.
void traceException(const Trace& trace) noexcept;

}  // namespace ZAV
