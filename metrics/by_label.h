/// The same figure for each value of a label.
#pragma once

#include <algorithm>
#include <cstddef>
#include <deque>
#include <string>
#include <string_view>
#include <vector>

namespace metrics {

/// Stands for every value that was not named beforehand.
inline constexpr std::string_view kOtherLabel = "other";

/// One of `Figure`, a Counter or a Histogram, for each value of a label. The values are fixed when
/// it is made, so that nobody who sends requests can add series: what is not among them counts as
/// "other". Any thread, as far as the figures allow it.
template <typename Figure>
class ByLabel {
public:
    /// `arguments` make each figure. A value that is given twice counts once.
    template <typename... Arguments>
    explicit ByLabel(const std::vector<std::string>& values, const Arguments&... arguments) {
        for (const std::string& value : values) {
            if (indexOf(value) == values_.size() && value != kOtherLabel) values_.push_back(value);
        }
        for (std::size_t i = 0; i <= values_.size(); ++i)
            figures_.emplace_back(arguments...);
    }

    Figure& at(std::string_view value) { return figures_[indexOf(value)]; }
    const Figure& at(std::string_view value) const { return figures_[indexOf(value)]; }

    /// Calls `visit` with each value and its figure, in the order in which they were given and
    /// "other" at the end.
    template <typename Visit>
    void each(const Visit& visit) const {
        for (std::size_t i = 0; i < values_.size(); ++i)
            visit(std::string_view(values_[i]), figures_[i]);
        visit(kOtherLabel, figures_.back());
    }

private:
    /// That of "other" if the value is not known.
    std::size_t indexOf(std::string_view value) const {
        const auto found = std::find(values_.begin(), values_.end(), value);
        return static_cast<std::size_t>(found - values_.begin());
    }

    std::vector<std::string> values_;
    std::deque<Figure> figures_;  ///< one more than values; those with atomics cannot move
};

}  // namespace metrics
