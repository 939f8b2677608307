/// The home directory as the whole process knows it.
#pragma once

extern "C" {

/// The value of the environment variable "TOVRINHOME", as BSS1_GetEnv gave it: not copied, never
/// freed, null until start-up has found it. Set once by start-up, which also defines it, and only
/// read afterwards, by any thread.
[[gnu::visibility("default")]] extern const char* ZAV_TOVRINHOME;

}  // extern "C"
