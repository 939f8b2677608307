#include "ctl/show/rows.h"

#include <algorithm>
#include <cstdio>
#include <nlohmann/json.hpp>

#include "ctl/show/message_catalogue.h"

using nlohmann::json;

namespace ctl {
namespace {

std::string cellText(const json& value) {
    if (value.is_string()) return value.get<std::string>();
    if (value.is_null()) return {};
    return value.dump();
}

/// Places that a text takes on a terminal: characters, not bytes.
std::size_t width(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return (static_cast<unsigned char>(c) & 0xC0U) != 0x80U;
    }));
}

void printLine(const std::vector<std::string>& cells, const std::vector<std::size_t>& widths) {
    std::string line;
    for (std::size_t i = 0; i < cells.size(); ++i) {
        if (i > 0) line += "  ";
        line += cells[i];
        line.append(widths[i] - width(cells[i]), ' ');
    }
    line.erase(line.find_last_not_of(' ') + 1);
    std::printf("%s\n", line.c_str());
}

}  // namespace

std::string textOf(const json& row, const std::string& column) {
    const auto found = row.find(column);
    return found == row.end() ? std::string() : cellText(*found);
}

int returnCodeOf(const json& row) {
    const auto found = row.find("RETVAL");
    return found != row.end() && found->is_number_integer() ? found->get<int>() : 0;
}

std::string describeRow(const json& row) {
    return describeResult(returnCodeOf(row), textOf(row, "RETMSGID"), textOf(row, "RETMSGPARM"));
}

void printJson(const json& document) {
    std::printf("%s\n", document.dump(2, ' ', false, json::error_handler_t::replace).c_str());
}

void printTable(const json& rows, const std::vector<TableColumn>& columns) {
    std::vector<std::vector<std::string>> lines(1);
    for (const TableColumn& column : columns)
        lines[0].push_back(column.title);
    for (const json& row : rows) {
        std::vector<std::string> line;
        for (const TableColumn& column : columns) {
            line.push_back(printable(textOf(row, column.column)));
        }
        lines.push_back(std::move(line));
    }
    std::vector<std::size_t> widths(columns.size(), 0);
    for (const auto& line : lines) {
        for (std::size_t i = 0; i < line.size(); ++i) {
            widths[i] = std::max(widths[i], width(line[i]));
        }
    }
    for (const auto& line : lines)
        printLine(line, widths);
}

void printRecords(const json& rows) {
    bool first = true;
    for (const json& row : rows) {
        if (!first) std::printf("\n");
        first = false;
        std::size_t widest = 0;
        for (const auto& item : row.items())
            widest = std::max(widest, item.key().size());
        for (const auto& item : row.items()) {
            const std::string text = cellText(item.value());
            if (text.empty()) continue;
            std::printf("%-*s  %s\n", static_cast<int>(widest), item.key().c_str(),
                        printable(text).c_str());
        }
    }
}

}  // namespace ctl
