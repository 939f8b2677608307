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
    EXPECT_EQ(request.NumColumns(), count);
    for (int i = 0; i < count; ++i) {
        const ExpectedColumn& column = expected[static_cast<std::size_t>(i)];
        ColumnInfo info{};
        EXPECT_EQ(request.GetColumnInfo(&info, i), 0);
        EXPECT_STREQ(info.name, column.name);
        EXPECT_EQ(info.offset, column.offset) << column.name;
        EXPECT_EQ(info.length, column.length) << column.name;
        EXPECT_EQ(info.type, column.type) << column.name;
    }
}

/// The bounds of column numbers: the one after the last is accepted and fills nothing.
inline void expectColumnBounds(rtoxa& request) {
    const int count = request.NumColumns();
    ColumnInfo info{"untouched", 1, 2, 3};
    EXPECT_EQ(request.GetColumnInfo(&info, -1), 0x21060007);
    EXPECT_EQ(request.GetColumnInfo(&info, count + 1), 0x21060007);
    EXPECT_EQ(request.GetColumnInfo(&info, count), 0);
    EXPECT_STREQ(info.name, "untouched");
    EXPECT_EQ(info.offset, 1);
    EXPECT_EQ(info.length, 2);
    EXPECT_EQ(info.type, 3);
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
        EXPECT_EQ(compareColumn(request, column.attribute, row, OPER_EQ, "7"), 1) << column.name;
        EXPECT_EQ(compareColumn(request, column.attribute, row, OPER_NE, "7"), 0) << column.name;
        EXPECT_EQ(compareColumn(request, column.attribute, row, OPER_EQ, "8"), 0) << column.name;
        EXPECT_EQ(compareColumn(request, column.attribute, row, OPER_LT, "8"), 1) << column.name;
        EXPECT_EQ(compareColumn(request, column.name, row, OPER_EQ, "7"), 0) << column.name;
    }
    const std::string row(rowSize, ' ');
    const std::string longer = std::string(columns[0].attribute) + "X";
    EXPECT_EQ(compareColumn(request, longer.c_str(), row, OPER_EQ, ""), 0);
    EXPECT_EQ(compareColumn(request, "", row, OPER_EQ, ""), 0);
    EXPECT_EQ(compareColumn(request, "NOSUCH", row, OPER_NE, "x"), 0);
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
    EXPECT_EQ(slotOf(&Base::PrintSelf), 0u);
    EXPECT_EQ(slotOf(&Agent::TakeSample), 1u);
    EXPECT_EQ(slotOf(&Base::NumColumns), 2u);
    EXPECT_EQ(slotOf(&Base::GetColumnInfo), 3u);
    EXPECT_EQ(slotOf(&Base::ExecuteCommand), 4u);
    EXPECT_EQ(slotOf(&Base::InsertRow), 7u);
    EXPECT_EQ(slotOf(&Base::CheckForException), 8u);
    EXPECT_EQ(slotOf(&Base::ColumnIsException), 9u);
    EXPECT_EQ(slotOf(&Base::CommandCompleted), 10u);
    EXPECT_EQ(slotOf(&Base::AddData), 11u);
}

template <typename Manager>
void expectManagerSlots() {
    EXPECT_EQ(slotOf(&Manager::Shutdown), 2u);
    EXPECT_EQ(slotOf(&Manager::CreateRtoxa), 3u);
}
