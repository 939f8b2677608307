#include "ctl/show/table.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/fold.h"
#include "ctl/show/printable.h"

using nlohmann::json;

namespace ctl {
namespace {

using Line = std::vector<std::string>;

constexpr std::size_t kLeastRoom = 20;  // for a record's values

std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(width - widthOf(text), ' ');
}

std::string joined(const Line& cells, const std::vector<std::size_t>& widths) {
    std::string text;
    for (std::size_t i = 0; i < cells.size(); ++i)
        text += (i > 0 ? "  " : "") + padded(cells[i], widths[i]);
    text.erase(text.find_last_not_of(' ') + 1);
    return text + "\n";
}

/// A line whose cells may take several lines, each in its own column.
std::string joinedCells(const Line& cells, const std::vector<std::size_t>& widths) {
    std::vector<Line> pieces;
    std::size_t height = 1;
    for (std::size_t i = 0; i < cells.size(); ++i) {
        pieces.push_back(folded(cells[i], std::max<std::size_t>(widths[i], 1)));
        height = std::max(height, pieces.back().size());
    }
    std::string text;
    for (std::size_t line = 0; line < height; ++line) {
        Line part;
        for (const Line& piece : pieces)
            part.push_back(line < piece.size() ? piece[line] : std::string());
        text += joined(part, widths);
    }
    return text;
}

/// Takes from the widest columns until all fit beside each other. The first one is what a line is
/// called by and is typed or copied from here, so it stays whole if it is not too long.
void fit(std::vector<std::size_t>& widths) {
    constexpr std::size_t kLeast = 8;
    constexpr std::size_t kLongestName = 40;
    std::size_t total = 2 * (widths.size() - 1);
    for (const std::size_t width : widths)
        total += width;
    const auto last = widths.front() <= kLongestName ? widths.rend() - 1 : widths.rend();
    while (total > kColumns && last != widths.rbegin()) {
        // Of equals the last, which is the one with the text to read.
        const auto widest = std::max_element(widths.rbegin(), last);
        if (*widest <= kLeast) return;
        --*widest;
        --total;
    }
}

std::vector<std::size_t> widthsOf(const std::vector<Line>& lines) {
    std::vector<std::size_t> widths(lines.front().size(), 0);
    for (const Line& line : lines) {
        for (std::size_t i = 0; i < line.size(); ++i)
            widths[i] = std::max(widths[i], widthOf(line[i]));
    }
    fit(widths);
    return widths;
}

std::string recordText(const json& row) {
    std::size_t widest = 0;
    for (const auto& item : row.items())
        widest = std::max(widest, widthOf(printable(item.key())));
    const std::size_t room =
        widest + 2 + kLeastRoom < kColumns ? kColumns - widest - 2 : kLeastRoom;
    std::string text;
    for (const auto& item : row.items()) {
        const std::string value = redacted(valueText(item.value()));
        if (value.empty()) continue;
        const Line pieces = folded(value, room);
        for (std::size_t i = 0; i < pieces.size(); ++i)
            text += padded(i == 0 ? printable(item.key()) : "", widest) + "  " + pieces[i] + "\n";
    }
    return text;
}

}  // namespace

std::string tableText(const json& rows, const std::vector<TableColumn>& columns) {
    std::vector<Line> lines(1);
    for (const TableColumn& column : columns)
        lines.front().push_back(column.title);
    for (const json& row : rows) {
        Line line;
        for (const TableColumn& column : columns)
            line.push_back(redacted(textOf(row, column.column)));
        lines.push_back(std::move(line));
    }
    const std::vector<std::size_t> widths = widthsOf(lines);
    std::string text;
    for (const Line& line : lines)
        text += joinedCells(line, widths);
    return text;
}

std::string recordsText(const json& rows) {
    std::string text;
    for (const json& row : rows)
        text += (text.empty() ? "" : "\n") + recordText(row);
    return text;
}

}  // namespace ctl
