#include "tests/fleet/scale/scale_table.h"

#include <algorithm>
#include <iomanip>
#include <sstream>

namespace fleet_scale {

void ScaleTable::note(const std::string& row, const std::string& figure) {
    if (std::find(rows_.begin(), rows_.end(), row) == rows_.end()) rows_.push_back(row);
    figures_[row][columns_.back()] = figure;
}

void ScaleTable::note(const std::string& row, double figure, int decimals) {
    std::ostringstream text;
    text << std::fixed << std::setprecision(decimals) << figure;
    note(row, text.str());
}

std::string ScaleTable::text() const {
    std::ostringstream text;
    text << "| Hosts |";
    for (const std::string& column : columns_)
        text << ' ' << column << " |";
    text << "\n|---|";
    for (std::size_t i = 0; i < columns_.size(); ++i)
        text << "---:|";
    text << '\n';
    for (const std::string& row : rows_) {
        text << "| " << row << " |";
        for (const std::string& column : columns_) {
            const auto& figures = figures_.at(row);
            const auto figure = figures.find(column);
            text << ' ' << (figure == figures.end() ? "" : figure->second) << " |";
        }
        text << '\n';
    }
    return text.str();
}

}  // namespace fleet_scale
