/// A table for tests of the host: its columns, samples and events are the test's.
#pragma once

#include <cstring>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "platform/oxa.h"

/// Builds rows of columns that stand one behind the other.
class RowBuilder {
public:
    RowBuilder& text(const std::string& value, std::size_t width) {
        std::string field = value.substr(0, width);
        field.resize(width, ' ');
        row_ += field;
        return *this;
    }
    RowBuilder& integer(int value) {
        row_.append(reinterpret_cast<const char*>(&value), sizeof value);
        return *this;
    }
    operator std::string() const { return row_; }

private:
    std::string row_;
};

class MadeUpTable final : public TableManager {
public:
    using Sampler = std::function<int(rtoxa& request)>;

    MadeUpTable(const char* name, std::vector<ColumnInfo> columns)
        : TableManager("TEST", name), columns_(std::move(columns)) {
        for (const ColumnInfo& column : columns_)
            rowSize_ += static_cast<unsigned>(column.length);
    }

    /// Runs for each sample, on the thread that samples. Set before requests come.
    Sampler sampler = [](rtoxa&) { return static_cast<int>(OXA_OK); };

    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override {
        return new Object(detail, context, this);
    }

    /// Hands one row to all live objects. Returns the last status of a dispatch that is not 0.
    int publish(std::string row) {
        int result = OXA_OK;
        lock();
        RtoxaListIter live(this);
        while (rtoxa* const object = live.Next()) {
            object->UseHandle(object->Handle());
            if (object->CheckForException(row.data()) == 1) object->InsertRow(row.data());
            const int status = object->Dispatch();
            if (status != OXA_OK) result = status;
            object->ClearCount();
            object->Drop();
        }
        unlock();
        return result;
    }

    std::size_t liveObjects() {
        lock();
        RtoxaListIter live(this);
        std::size_t count = 0;
        while (live.Next() != nullptr)
            ++count;
        unlock();
        return count;
    }

private:
    class Object final : public rtoxa {
    public:
        Object(RequestDetail* detail, ContextInfo* context, MadeUpTable* table)
            : rtoxa(detail, context, table), table_(*table) {
            SetRowSize(table_.rowSize_);
        }
        int TakeSample() override { return table_.sampler(*this); }
        int NumColumns() override { return static_cast<int>(table_.columns_.size()); }
        int GetColumnInfo(ColumnInfo* info, int index) override {
            if (index < 0 || index >= NumColumns()) return OXA_BAD_COLUMN;
            *info = table_.columns_[static_cast<std::size_t>(index)];
            return OXA_OK;
        }
        int ColumnIsException(char* column, char* row, _IntfOper op, char* value) override {
            for (const ColumnInfo& info : table_.columns_) {
                if (::strcasecmp(info.name, column) != 0) continue;
                if (info.type == OXA_TYPE_CHARACTER) {
                    return IsException(op, row + info.offset, value, info.length);
                }
                int field = 0;
                std::memcpy(&field, row + info.offset, sizeof field);
                return IsException(op, field, value);
            }
            return 0;
        }

    private:
        MadeUpTable& table_;
    };

    const std::vector<ColumnInfo> columns_;
    unsigned rowSize_ = 0;
};

/// Inserts a row when the request's filter takes it.
inline void insert(rtoxa& request, std::string row) {
    if (request.CheckForException(row.data()) == 1) request.InsertRow(row.data());
}

/// NAME (8 bytes), NUMBER and TEXT (16 bytes).
inline std::vector<ColumnInfo> plainColumns() {
    return {{"name", 0, 8, OXA_TYPE_CHARACTER},
            {"number", 8, 4, OXA_TYPE_INTEGER},
            {"text", 12, 16, OXA_TYPE_CHARACTER}};
}

inline std::string plainRow(const std::string& name, int number, const std::string& text) {
    return RowBuilder().text(name, 8).integer(number).text(text, 16);
}
