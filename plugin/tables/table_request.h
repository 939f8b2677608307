/// What the requests of all tables have in common.
#pragma once

#include <new>

#include "base/zavtrace.h"
#include "platform/oxa.h"
#include "tables/table_schema.h"
#include "util/exceptions.h"

/// Runs `body` and returns its status. An exception must not reach the framework's threads: it is
/// traced and becomes a status.
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

/// A request on a table of which it knows the schema. Requests belong to the framework, which
/// never uses one on two threads at a time.
class TableRequest : public rtoxa {
public:
    TableRequest(const TableSchema& schema, RequestDetail* detail, ContextInfo* context,
                 TableManager* manager);
    ~TableRequest() override = default;

    /// Traces the request and its rows at detail level.
    void PrintSelf() override;
    int NumColumns() override;
    /// The index one beyond the last column is accepted and fills nothing.
    int GetColumnInfo(ColumnInfo* info, int index) override;
    /// The column is found by its exact upper-case name.
    int ColumnIsException(char* column, char* row, _IntfOper op, char* value) override;

    /// Whether row `index` is held.
    bool CheckDataIndex(int index) const;

protected:
    /// Inserts those of `count` adjoining rows that satisfy the filter, until an insert fails.
    /// Returns the last insert's status, 0 without one.
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

    /// Inserts those of `count` rows that satisfy the request's filter, until an insert fails. The
    /// rows stay the caller's. Returns the last insert's status, 0 without one.
    virtual int AddData(Row* rows, int count) {
        return addRows(reinterpret_cast<char*>(rows), count);
    }
    /// Non-zero when the row satisfies the request's filter.
    int IsRowException(Row* row) { return CheckForException(reinterpret_cast<char*>(row)); }
    /// Row `index`, which must be held; valid until rows are next added or cleared.
    Row* GetRow(int index) const { return reinterpret_cast<Row*>(Data(index)); }
};
