/// The product's version, as the build gives it.
#pragma once

namespace host {

inline constexpr const char* kVersion = ZAV_VERSION;

}  // namespace host
