/// The agent framework: tables, the requests on them and the rows that answer.
///
/// An agent library registers one TableManager for each table that it offers. For each query or
/// subscription the framework asks the manager for an rtoxa, which produces the rows. For a plain
/// query the framework makes an object, calls TakeSample() once, takes the rows and destroys the
/// object. The object of a subscription stays on its manager's list of live objects, so that later
/// rows reach it.
///
/// Threads: CreateRtoxa() and TakeSample() run on the framework's threads, several at a time for
/// different objects, but never two for one object. The list of live objects is read and changed
/// under the manager's lock only. A live object is destroyed once it is off the list and none of
/// its handles is in use.
///
/// Lock order: a manager's lock, then the lock of one of its live objects (held while its rows go
/// to the requester), then whatever the requester's sink locks. None of them is held during
/// CreateRtoxa() and TakeSample().
#pragma once

#include <memory>

/// The request and its context. They belong to the framework; a table's classes pass them through.
struct RequestDetail;
struct ContextInfo;
struct RtoxaAutomationCapsule;

class TableManager;
class RtoxaListIter;
struct OxaTable;

/// Status values; 0 is success.
enum : int {
    OXA_OK = 0,
    OXA_NO_MEMORY = 0x21060002,
    OXA_END_OF_FILTER = 0x21060005,  ///< GetFilterInfo has handed out every entry
    OXA_BAD_COLUMN = 0x21060007,     ///< a column number that the table does not have
    OXA_OVERFLOW = 0x21060009,       ///< the requester takes rows too slowly
    OXA_GONE = 0x2106000A,           ///< the requester or the requested table no longer exists
    OXA_FAILED = 0x2106000B,         ///< the table could not carry out the request
};

/// Type codes of columns.
enum : int {
    OXA_TYPE_INTEGER = 3,    ///< signed, 32 bits, in the machine's byte order
    OXA_TYPE_CHARACTER = 9,  ///< blank-padded to the column's length, not 0-terminated
};

/// Comparison operators: field OPERATOR value. For LIKE the value is a pattern, in which "*" stands
/// for any number of characters.
enum _IntfOper {
    OPER_EQ,
    OPER_NE,
    OPER_LT,
    OPER_LE,
    OPER_GT,
    OPER_GE,
    OPER_LIKE,
};

/// One entry of a request's filter. The texts belong to the framework and live as long as the
/// rtoxa that handed them out.
struct FLT1_FILTERINFO {
    const char* columnName;  ///< 0-terminated, as the requester wrote it
    _IntfOper op;
    const char* value;  ///< `valueLength` bytes, followed by a terminating 0
    unsigned valueLength;
};

/// One column of a table.
struct ColumnInfo {
    const char* name;  ///< constant text, lower case
    int offset;        ///< bytes from the row's start
    int length;        ///< bytes
    int type;          ///< OXA_TYPE_...
};

/// One query or subscription, with the rows that answer it.
class rtoxa {
public:
    /// All three belong to the caller and must live until the constructor returns. A null `detail`
    /// stands for a request without a filter, a null `context` for a plain query.
    rtoxa(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    rtoxa(const rtoxa&) = delete;
    rtoxa& operator=(const rtoxa&) = delete;

    /// Traces the object and its rows.
    virtual void PrintSelf();
    /// Produces the rows of a plain query. Returns 0 or a status.
    virtual int TakeSample() = 0;
    virtual int NumColumns();
    /// Describes column `index` in `*info`. Returns 0 or OXA_BAD_COLUMN. Callers must expect 0 with
    /// `*info` unchanged, which means that there is no such column.
    virtual int GetColumnInfo(ColumnInfo* info, int index);
    /// Runs a command for an automation. The base class has no commands and returns OXA_FAILED.
    virtual int ExecuteCommand(char* command, int length, char* result);
    virtual ~rtoxa();
    /// Appends a copy of one row. Returns 0 or OXA_NO_MEMORY.
    virtual int InsertRow(char* row);
    /// Returns 1 if the row satisfies every entry of the filter, else 0. Entries on columns that
    /// the table does not have are ignored; names are compared exactly, in upper case.
    virtual int CheckForException(char* row);
    /// Returns 1 if the comparison of the named column of `row` with the 0-terminated `value`
    /// holds, else 0; 0 for an unknown column. The base class knows no columns.
    virtual int ColumnIsException(char* column, char* row, _IntfOper op, char* value);
    virtual void CommandCompleted(RtoxaAutomationCapsule* capsule);

    /// Fetches the filter's entries one by one, in the request's order and unchanged. Returns 0,
    /// and OXA_END_OF_FILTER after the last one.
    int GetFilterInfo(FLT1_FILTERINFO* entry);

    /// Sets the number of bytes per row; to be called once, before the first InsertRow().
    void SetRowSize(unsigned bytes);
    /// Sets the least number of rows to make room for at a time. Beyond that, room grows
    /// geometrically.
    void SetAllocationDefault(unsigned rows);
    unsigned AllocationDefault() const;

    /// Number of rows held now.
    int NumDataItems() const;
    int NumRowsAllocated() const;
    /// Row `index`, which must exist; valid until the next InsertRow() or ClearCount().
    char* Data(int index) const;
    /// Removes all rows but keeps their memory for the next ones.
    void ClearCount();

    const char* ApplicationName() const;
    const char* TableName() const;
    /// Seconds between samples; 0 for a plain query.
    int Interval() const;
    /// 0 = plain query, 1 = subscription.
    int SampleType() const;
    /// For traces: the object's number, and how often its handle is in use.
    unsigned ObjectNumber() const;
    unsigned UseCount() const;

    /// The number by which the framework knows the object; never 0.
    unsigned long Handle() const;
    /// Keeps this object alive until Drop(). Does nothing if `handle` is not the object's own.
    void UseHandle(unsigned long handle);
    /// Ends a use that UseHandle() began. If the object is no longer live and this was its last
    /// use, it is destroyed. Without a use it does nothing.
    void Drop();
    /// Passes the rows of a live object to its requester, without waiting for it. Without rows the
    /// requester is not called. Returns 0, OXA_OVERFLOW or OXA_GONE. Does nothing for a plain
    /// query, whose rows the framework takes at its end.
    int Dispatch();

protected:
    /// Compares a character field of `length` bytes with a 0-terminated value. Both count as padded
    /// with blanks to `length`. A value is cut to `length` bytes, a pattern to `length` bytes
    /// besides its "*". LIKE ignores trailing blanks on both sides. Bytes compare as unsigned
    /// numbers.
    static int IsException(_IntfOper op, const char* field, const char* value, int length);
    /// Compares an integer field with a decimal value, which may have a sign and blanks around it.
    /// 0 if the value is not a number. LIKE compares the field's digits as text.
    static int IsException(_IntfOper op, int field, const char* value);

private:
    friend class RtoxaListIter;
    friend struct OxaAccess;
    struct State;
    const std::unique_ptr<State> state_;
};

/// One table of one application.
class TableManager {
public:
    /// The names are texts that outlive the manager. Managers with the same names share their live
    /// objects and the lock that guards them.
    TableManager(const char* application, const char* table);
    TableManager(const TableManager&) = delete;
    TableManager& operator=(const TableManager&) = delete;
    /// Withdraws the table if it is registered. No request on it may be running.
    virtual ~TableManager();

    /// The framework calls this, without holding locks, when it stops using this manager.
    virtual void Shutdown(unsigned long reason);
    /// Makes the object of one request; the caller owns it. Returns null when memory is short.
    virtual rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) = 0;

    /// Offers the table to requesters. Replaces and shuts down a manager that is registered under
    /// the same names, and takes over its live objects. Returns 0 or a status.
    int RegisterWithManager();

    /// Guards the list of live objects. Not recursive.
    void lock();
    void unlock();

    const char* ApplicationName() const;
    const char* TableName() const;

private:
    friend class rtoxa;
    friend class RtoxaListIter;
    friend struct OxaAccess;
    OxaTable& table_;  // what the framework keeps for the two names; never destroyed
};

/// Iterates over a manager's live objects in the order in which they were added. The caller holds
/// the manager's lock for as long as it uses the iterator.
class RtoxaListIter {
public:
    explicit RtoxaListIter(TableManager* manager);
    /// The next object, or null after the last one.
    rtoxa* Next();

private:
    rtoxa* next_;
};

/// The name of the node that this agent process represents: 0-terminated, at most 64 bytes.
const char* OXA_GetOriginnode(const rtoxa* request);
