#include "ctl/show/table.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/printable.h"

using nlohmann::json;

namespace ctl {
namespace {

using Line = std::vector<std::string>;

/// Places that a text takes on a terminal: characters, not bytes.
std::size_t widthOf(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<unsigned char>(c) & 0xC0U) != 0x80U;
    }));
}

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

std::vector<std::size_t> widthsOf(const std::vector<Line>& lines) {
    std::vector<std::size_t> widths(lines.front().size(), 0);
    for (const Line& line : lines) {
        for (std::size_t i = 0; i < line.size(); ++i)
            widths[i] = std::max(widths[i], widthOf(line[i]));
    }
    return widths;
}

std::string recordText(const json& row) {
    std::size_t widest = 0;
    for (const auto& item : row.items())
        widest = std::max(widest, widthOf(item.key()));
    std::string text;
    for (const auto& item : row.items()) {
        const std::string value = valueText(item.value());
        if (!value.empty()) text += padded(item.key(), widest) + "  " + printable(value) + "\n";
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
            line.push_back(printable(textOf(row, column.column)));
        lines.push_back(std::move(line));
    }
    const std::vector<std::size_t> widths = widthsOf(lines);
    std::string text;
    for (const Line& line : lines)
        text += joined(line, widths);
    return text;
}

std::string recordsText(const json& rows) {
    std::string text;
    for (const json& row : rows)
        text += (text.empty() ? "" : "\n") + recordText(row);
    return text;
}

}  // namespace ctl
