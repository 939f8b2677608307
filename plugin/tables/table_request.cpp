#include "tables/table_request.h"

#include <cstring>
#include <string>

using ZAV::Trace;

namespace {

int integerAt(const char* field) {
    int number = 0;
    std::memcpy(&number, field, sizeof number);
    return number;
}

}  // namespace

TableRequest::TableRequest(const TableSchema& schema, RequestDetail* detail, ContextInfo* context,
                           TableManager* manager)
    : rtoxa(detail, context, manager), schema_(schema) {
    Trace trace(*schema_.unit);
    SetRowSize(schema_.rowSize);
    SetAllocationDefault(1);
}

int TableRequest::NumColumns() {
    return schema_.columnCount;
}

int TableRequest::GetColumnInfo(ColumnInfo* info, int index) {
    Trace trace(*schema_.unit);
    if (index < 0 || index > NumColumns()) return trace.exit<int>(OXA_BAD_COLUMN);
    if (index < NumColumns()) {
        const TableColumn& column = schema_.columns[index];
        *info = {column.name, column.offset, column.length, column.type};
    }
    return trace.exit<int>(OXA_OK);
}

int TableRequest::ColumnIsException(char* column, char* row, _IntfOper op, char* value) {
    Trace trace(*schema_.unit);
    const TableColumn* const found = schema_.find(column);
    if (found == nullptr) return trace.exit(0);
    const char* const field = row + found->offset;
    if (found->type == OXA_TYPE_INTEGER)
        return trace.exit(IsException(op, integerAt(field), value));
    return trace.exit(IsException(op, field, value, found->length));
}

bool TableRequest::CheckDataIndex(int index) const {
    return index >= 0 && index < NumDataItems();
}

int TableRequest::addRows(char* rows, int count) {
    Trace trace(*schema_.unit);
    int status = OXA_OK;
    for (int i = 0; i < count && status == OXA_OK; ++i) {
        char* const row = rows + static_cast<std::size_t>(i) * schema_.rowSize;
        if (CheckForException(row) == 0) continue;
        trace().detail("Passing row %d to InsertRow().", i);
        status = InsertRow(row);
    }
    return trace.exit(status);
}

void TableRequest::PrintSelf() {
    Trace trace(*schema_.unit);
    if (!trace.detailed()) return;
    guarded(trace, [&] {
        const std::string head = std::string(schema_.requestClass) + " @%p <%u,%u>\n";
        trace().detail(head.c_str(), static_cast<const void*>(this), ObjectNumber(), UseCount());
        trace().detail("\t::appl=%s,table=%s,interval=%d,samptype=%d\n", ApplicationName(),
                       TableName(), Interval(), SampleType());
        trace().detail("\t_data {\n");
        trace().detail("\t\tcount=%d, allocated=%d, allocSize=%d\n", NumDataItems(),
                       NumRowsAllocated(), AllocationDefault());
        for (int i = 0; i < NumDataItems(); ++i)
            printRow(trace, Data(i));
        trace().detail("\t}\n");
        return 0;
    });
}

void TableRequest::printRow(const Trace& trace, const char* row) const {
    trace().detail("\t\t{\n");
    for (int i = 0; i < schema_.columnCount; ++i) {
        const TableColumn& column = schema_.columns[i];
        const char* const field = row + column.offset;
        const std::string head = "\t\t" + std::string(column.name);
        if (column.type == OXA_TYPE_INTEGER) {
            trace().detail((head + "=%d\n").c_str(), integerAt(field));
        } else {
            const std::string format = head + "=\"%." + std::to_string(column.length) + "s\"\n";
            trace().detail(format.c_str(), field);
        }
    }
    trace().detail("\t\t}\n");
}
