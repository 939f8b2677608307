/// Checks that are the same for every table.
#pragma once

#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "platform/oxa.h"
#include "support/request_lender.h"

/// A column as requesters must see it.
struct ExpectedColumn {
    const char* attribute;
    const char* name;
    int offset;
    int length;
    int type;
};

/// A request on a manager of its own, created in the same way as by the framework.
template <typename Manager, typename Agent>
class MadeRequest {
public:
    explicit MadeRequest(const char* table, const std::vector<oxa::Predicate>& where = {},
                         int sampleType = 0)
        : manager_("ZAV", table) {
        const auto lend = sampleType == 0 ? lendQuery : lendSubscription;
        lend(where, [this](RequestDetail* detail, ContextInfo* context) {
            object_.reset(manager_.CreateRtoxa(detail, context));
        });
    }
    Agent& operator*() const { return *static_cast<Agent*>(object_.get()); }
    Agent* operator->() const { return static_cast<Agent*>(object_.get()); }
    Manager& manager() { return manager_; }

private:
    Manager manager_;
    std::unique_ptr<rtoxa> object_;
};

inline void expectColumns(rtoxa& request, const std::vector<ExpectedColumn>& expected) {
    const int count = static_cast<int>(expected.size());
    EXPECT_EQ(count, request.NumColumns());
    for (int i = 0; i < count; ++i) {
        const ExpectedColumn& column = expected[static_cast<std::size_t>(i)];
        ColumnInfo info{};
        EXPECT_EQ(0, request.GetColumnInfo(&info, i));
        EXPECT_STREQ(column.name, info.name);
        EXPECT_EQ(column.offset, info.offset) << column.name;
        EXPECT_EQ(column.length, info.length) << column.name;
        EXPECT_EQ(column.type, info.type) << column.name;
    }
}

/// The bounds of column numbers: the one after the last is accepted and fills nothing.
inline void expectColumnBounds(rtoxa& request) {
    const int count = request.NumColumns();
    ColumnInfo info{"untouched", 1, 2, 3};
    EXPECT_EQ(0x21060007, request.GetColumnInfo(&info, -1));
    EXPECT_EQ(0x21060007, request.GetColumnInfo(&info, count + 1));
    EXPECT_EQ(0, request.GetColumnInfo(&info, count));
    EXPECT_STREQ("untouched", info.name);
    EXPECT_EQ(1, info.offset);
    EXPECT_EQ(2, info.length);
    EXPECT_EQ(3, info.type);
}

inline int compareColumn(rtoxa& request, const char* column, const std::string& row, _IntfOper op,
                         const char* value) {
    std::string name(column), bytes(row), text(value);
    return request.ColumnIsException(name.data(), bytes.data(), op, text.data());
}

/// Every column is found only by its attribute name, and compared at its own offset and width.
inline void expectComparisons(rtoxa& request, std::size_t rowSize,
                              const std::vector<ExpectedColumn>& columns) {
    for (const ExpectedColumn& column : columns) {
        std::string row(rowSize, '#');
        const auto offset = static_cast<std::size_t>(column.offset);
        const auto length = static_cast<std::size_t>(column.length);
        std::string value = "7";
        if (column.type == OXA_TYPE_INTEGER) {
            const int seven = 7;
            std::memcpy(&row[offset], &seven, sizeof seven);
        } else {
            row.replace(offset, length, length, ' ');
            row[offset] = '7';
        }
        EXPECT_EQ(1, compareColumn(request, column.attribute, row, OPER_EQ, "7")) << column.name;
        EXPECT_EQ(0, compareColumn(request, column.attribute, row, OPER_NE, "7")) << column.name;
        EXPECT_EQ(0, compareColumn(request, column.attribute, row, OPER_EQ, "8")) << column.name;
        EXPECT_EQ(1, compareColumn(request, column.attribute, row, OPER_LT, "8")) << column.name;
        EXPECT_EQ(0, compareColumn(request, column.name, row, OPER_EQ, "7")) << column.name;
    }
    const std::string row(rowSize, ' ');
    const std::string longer = std::string(columns[0].attribute) + "X";
    EXPECT_EQ(0, compareColumn(request, longer.c_str(), row, OPER_EQ, ""));
    EXPECT_EQ(0, compareColumn(request, "", row, OPER_EQ, ""));
    EXPECT_EQ(0, compareColumn(request, "NOSUCH", row, OPER_NE, "x"));
}

/// The slot of a function in the table of virtual functions; a destructor takes two slots.
template <typename Function>
std::size_t slotOf(Function function) {
    std::ptrdiff_t offset = 0;
    static_assert(sizeof function >= sizeof offset);
    std::memcpy(&offset, &function, sizeof offset);
    return static_cast<std::size_t>(offset - 1) / sizeof(void*);
}

/// The order of the virtual functions that the framework calls.
template <typename Base, typename Agent>
void expectRequestSlots() {
    EXPECT_EQ(0u, slotOf(&Base::PrintSelf));
    EXPECT_EQ(1u, slotOf(&Agent::TakeSample));
    EXPECT_EQ(2u, slotOf(&Base::NumColumns));
    EXPECT_EQ(3u, slotOf(&Base::GetColumnInfo));
    EXPECT_EQ(4u, slotOf(&Base::ExecuteCommand));
    EXPECT_EQ(7u, slotOf(&Base::InsertRow));
    EXPECT_EQ(8u, slotOf(&Base::CheckForException));
    EXPECT_EQ(9u, slotOf(&Base::ColumnIsException));
    EXPECT_EQ(10u, slotOf(&Base::CommandCompleted));
    EXPECT_EQ(11u, slotOf(&Base::AddData));
}

template <typename Manager>
void expectManagerSlots() {
    EXPECT_EQ(2u, slotOf(&Manager::Shutdown));
    EXPECT_EQ(3u, slotOf(&Manager::CreateRtoxa));
}
