/// How long the bus has for an answer.
#pragma once

#include <chrono>

namespace fleet {

/// To the centre at work. What does not come in time is asked again with the next round.
inline constexpr std::chrono::seconds kAnswerTime{5};

}  // namespace fleet
