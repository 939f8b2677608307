/// Figures of fleets of several sizes, side by side.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace fleet_scale {

class ScaleTable {
public:
    /// A column, with the number of its hosts.
    void begin(const std::string& column) { columns_.push_back(column); }
    /// A figure of the column that was begun last. Rows stand in the order in which they first
    /// came.
    void note(const std::string& row, const std::string& figure);
    void note(const std::string& row, double figure, int decimals);
    /// In Markdown, as it stands in docs/fleet-performance.md.
    std::string text() const;

private:
    std::vector<std::string> columns_;
    std::vector<std::string> rows_;
    std::map<std::string, std::map<std::string, std::string>> figures_;
};

}  // namespace fleet_scale
