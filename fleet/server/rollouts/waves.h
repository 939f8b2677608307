/// How many hosts get their orders together, and how many after them.
#pragma once

#include <cstddef>
#include <string_view>
#include <vector>

namespace fleet {

/// The waves of a roll-out to `all` hosts, as "1,10%,50%,100%": for each wave how many hosts have
/// their orders when it is released, those of the waves before it included.
///
/// Each entry is a Share above 0. Entries must rise; where a number stands beside a percentage,
/// which of them is greater depends on how many hosts there are, and a wave without at least one
/// more host than the one before it is left out, so that one text suits small fleets and large
/// ones. If the entries do not reach all hosts, the rest is the last wave. Throws RolloutError for
/// other texts.
std::vector<std::size_t> wavesOf(std::string_view text, std::size_t all);

}  // namespace fleet
