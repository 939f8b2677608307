/// The home directory, shared by the whole library.
#pragma once

extern "C" {

/// The value of the environment variable "TOVRINHOME", as BSS1_GetEnv returned it: not copied and
/// never freed. Null until start-up has set it, which it does once, before the tables are
/// registered; after that any thread may read it.
[[gnu::visibility("default")]] extern const char* ZAV_TOVRINHOME;

}  // extern "C"
