/// What an exception says, whatever its type.
#pragma once

namespace ZAV {

/// The text of the exception that is being handled; called in a catch block only, and valid until
/// its end.
const char* currentExceptionText() noexcept;

}  // namespace ZAV
