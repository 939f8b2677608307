/// The tables that the host offers.
#pragma once

#include <string_view>
#include <utility>
#include <vector>

#include "embedded/oxa_host.h"

namespace host {

/// Immutable, so pointers to its tables stay valid as long as it lives. Any thread.
class TableSet {
public:
    explicit TableSet(std::vector<oxa::Table> tables) : tables_(std::move(tables)) {}

    const std::vector<oxa::Table>& all() const { return tables_; }
    /// The table of exactly this name, or null.
    const oxa::Table* find(std::string_view name) const {
        for (const oxa::Table& table : tables_) {
            if (table.name == name) return &table;
        }
        return nullptr;
    }

private:
    const std::vector<oxa::Table> tables_;
};

}  // namespace host
