/// Whether a child of vfork shares its parent's memory. The thread sanitizer makes a fork of it, so
/// what a child stores before its exec does not arrive there.
#pragma once

#if defined(__SANITIZE_THREAD__)
constexpr bool kVforkSharesMemory = false;
#else
constexpr bool kVforkSharesMemory = true;
#endif
