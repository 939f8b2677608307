/// Base services: the process's environment and sleeping.
#pragma once

extern "C" {

/// The value of the environment variable `name`, or `fallback` when it is not set. The text belongs
/// to the environment: the caller neither changes nor frees it. As safe against concurrent changes
/// of the environment as the C library's getenv.
const char* BSS1_GetEnv(const char* name, const char* fallback);

/// Puts "NAME=value" into the environment. The text is copied. Returns 0 or an errno value: EINVAL
/// when `setting` is null, has no "=" or has no name before it.
int BSS1_PutEnv(const char* setting);

/// Sleeps for `seconds`, whatever signals arrive meanwhile. The library sleeps through this
/// operation only, so a program that defines its own controls all of the library's waiting.
void BSS1_Sleep(unsigned seconds);

}  // extern "C"
