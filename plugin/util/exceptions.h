/// Helpers for places that catch everything, because an exception must not leave a thread or reach
/// a caller that does not expect it.
#pragma once

#include "base/zavtrace.h"

namespace ZAV {

/// The text of the exception that is being handled. Call it in a catch block only; the text is
/// valid until the block ends.
const char* currentExceptionText() noexcept;

/// Traces the exception that is being handled; only the format when out of memory.
void traceException(const Trace& trace) noexcept;

}  // namespace ZAV
