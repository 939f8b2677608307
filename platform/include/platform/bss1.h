/// Base services: the process's environment and sleeping.
#pragma once

extern "C" {

/// Returns the value of the environment variable `name`, or `fallback` if it is not set. The text
/// belongs to the environment: the caller neither changes nor frees it. Like the C library's
/// getenv, not safe while another thread changes the environment.
const char* BSS1_GetEnv(const char* name, const char* fallback);

/// Puts "NAME=value" into the environment. The text is copied. Returns 0 or an errno value: EINVAL
/// when `setting` is null, has no "=" or has no name before it.
int BSS1_PutEnv(const char* setting);

/// Sleeps for `seconds`; signals do not cut it short. The plug-in never sleeps in any other way, so
/// a program that defines this function itself controls all of its waiting.
void BSS1_Sleep(unsigned seconds);

}  // extern "C"
