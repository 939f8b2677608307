/// What the requests of all tables share.
#pragma once

#include <new>

#include "base/zavtrace.h"
#include "platform/oxa.h"
#include "tables/table_schema.h"
#include "util/exceptions.h"

/// Runs `body` and returns its status. An exception must not reach the framework's threads, so it
/// is traced and turned into a status.
template <typename Body>
int guarded(const ZAV::Trace& trace, const Body& body) noexcept {
    try {
        return body();
    } catch (const std::bad_alloc&) {
        ZAV::traceException(trace);
        return OXA_NO_MEMORY;
    } catch (...) {
        ZAV::traceException(trace);
        return OXA_FAILED;
    }
}

/// A request on a table that is described by a schema. The framework owns requests and never uses
/// one on two threads at a time.
class TableRequest : public rtoxa {
public:
    TableRequest(const TableSchema& schema, RequestDetail* detail, ContextInfo* context,
                 TableManager* manager);
    ~TableRequest() override = default;

    /// Traces the request and its rows at detail level.
    void PrintSelf() override;
    int NumColumns() override;
    /// Accepts the index one past the last column, and fills nothing then.
    int GetColumnInfo(ColumnInfo* info, int index) override;
    /// Finds the column by its exact upper-case name.
    int ColumnIsException(char* column, char* row, _IntfOper op, char* value) override;

    /// Whether the request holds a row with this index.
    bool CheckDataIndex(int index) const;

protected:
    /// Inserts those of `count` contiguous rows that pass the filter, until an insert fails.
    /// Returns the status of the last insert, or 0 when there was none.
    int addRows(char* rows, int count);

private:
    void printRow(const ZAV::Trace& trace, const char* row) const;

    const TableSchema& schema_;
};

/// A request on the table whose rows are of type Row.
template <typename Row>
class TypedTableRequest : public TableRequest {
public:
    using TableRequest::TableRequest;

    /// Inserts those of `count` rows that pass the request's filter, until an insert fails. Copies
    /// the rows. Returns the status of the last insert, or 0 when there was none.
    virtual int AddData(Row* rows, int count) {
        return addRows(reinterpret_cast<char*>(rows), count);
    }
    /// Returns non-zero when the row passes the request's filter.
    int IsRowException(Row* row) { return CheckForException(reinterpret_cast<char*>(row)); }
    /// Returns row `index`, which the request must hold. Valid until rows are next added or
    /// cleared.
    Row* GetRow(int index) const { return reinterpret_cast<Row*>(Data(index)); }
};
