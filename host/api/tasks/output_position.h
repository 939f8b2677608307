/// Where a reader of a task's output stands.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace host {

/// Behind so many bytes of what the task's commands have written in one run of the host.
struct OutputPosition {
    std::int64_t run = 0;
    std::array<std::uint64_t, 2> bytes{};  ///< of the standard output and the standard error
};

/// "<run>-<bytes>-<bytes>"
std::string textOf(const OutputPosition& position);

/// Reads such a text; nothing when it is not one.
std::optional<OutputPosition> outputPositionIn(std::string_view text);

}  // namespace host
