/// A number of hosts as an operator writes it: "5", or "10%" of all that are meant.
#pragma once

#include <cstddef>
#include <string_view>

namespace fleet {

class Share {
public:
    /// Reads "N" from 0 or "P%" from 0 to 100, in plain decimal digits without anything around
    /// them. Throws RolloutError for all else.
    explicit Share(std::string_view text);

    bool isPercentage() const { return isPercentage_; }
    std::size_t value() const { return value_; }

    /// The number of hosts. What is to be reached is rounded up: 10% of 3 hosts is one.
    std::size_t atLeast(std::size_t all) const;
    /// What must not be exceeded is rounded down: 2% of 10 hosts is none, because one would be 10%.
    /// A number may be greater than `all`.
    std::size_t atMost(std::size_t all) const;

private:
    bool isPercentage_ = false;
    std::size_t value_ = 0;
};

}  // namespace fleet
