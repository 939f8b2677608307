/// The agent framework: tables, the requests on them and the rows that answer.
///
/// A table is offered by a TableManager, of which an agent library registers one per table. For
/// each query or subscription the framework asks the manager for an rtoxa, which works out rows and
/// hands them back. A plain query makes an object, calls TakeSample() once, takes its rows and
/// destroys it. A subscription makes an object that stays on its manager's list of live objects, so
/// that rows which arrive later reach it.
///
/// Threads: CreateRtoxa() and TakeSample() run on the framework's own threads, several at a time
/// for different objects, never two for one object. The list of live objects is walked and changed
/// under the manager's lock only, and a live object is destroyed only when it is off the list and
/// no handle to it is in use.
///
/// Order of locks: a manager's lock, then the lock of one of its live objects (held while its rows
/// are handed to the requester), then whatever the requester's sink takes. CreateRtoxa() and
/// TakeSample() are called without any of them.
#pragma once

#include <memory>

/// What was asked and for whom; the framework's own, passed through by a table's classes.
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
    OXA_OVERFLOW = 0x21060009,       ///< the requester does not take rows as fast as they come
    OXA_GONE = 0x2106000A,           ///< the requester, or what was asked for, is not there
    OXA_FAILED = 0x2106000B,         ///< the table could not do what was asked
};

/// Type codes of columns.
enum : int {
    OXA_TYPE_INTEGER = 3,    ///< signed, 32 bits, in the machine's byte order
    OXA_TYPE_CHARACTER = 9,  ///< blank-padded to the column's length, not 0-terminated
};

/// Comparison operators: field OPERATOR value. LIKE compares with a pattern in which "*" stands for
/// any run of characters, the empty one among them.
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
    const char* value;  ///< `valueLength` bytes, and a terminating 0 behind them
    unsigned valueLength;
};

/// One column of a table.
struct ColumnInfo {
    const char* name;  ///< constant text, lower case
    int offset;        ///< bytes from the row's start
    int length;        ///< bytes
    int type;          ///< OXA_TYPE_...
};

/// One query or subscription, and the rows that are to answer it.
class rtoxa {
public:
    /// All three belong to the caller; the manager outlives the object's construction, the other
    /// two need to live only until the constructor has returned. A null `detail` is a request
    /// without a filter, a null `context` that of a plain query.
    rtoxa(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    rtoxa(const rtoxa&) = delete;
    rtoxa& operator=(const rtoxa&) = delete;

    /// Traces the object and its rows.
    virtual void PrintSelf();
    /// Works out the rows of a plain query. Returns 0 or a status.
    virtual int TakeSample() = 0;
    virtual int NumColumns();
    /// Describes column `index`. Returns 0 or OXA_BAD_COLUMN; `*info` is untouched when there is
    /// nothing to say.
    virtual int GetColumnInfo(ColumnInfo* info, int index);
    /// Runs a command for an automation; the base has none and answers OXA_FAILED.
    virtual int ExecuteCommand(char* command, int length, char* result);
    virtual ~rtoxa();
    /// Appends a copy of one row. Returns 0 or OXA_NO_MEMORY.
    virtual int InsertRow(char* row);
    /// 1 when the row satisfies every entry of the filter, else 0. An entry whose name no column
    /// of the table has (names are compared exactly, in upper case) restricts nothing.
    virtual int CheckForException(char* row);
    /// 1 when the named column of `row` compares with the 0-terminated `value` as `op` says, else
    /// 0; 0 for an unknown column. The base knows no column.
    virtual int ColumnIsException(char* column, char* row, _IntfOper op, char* value);
    virtual void CommandCompleted(RtoxaAutomationCapsule* capsule);

    /// Hands out the filter's entries one after the other, in the request's order and unchanged.
    /// Returns 0, then OXA_END_OF_FILTER.
    int GetFilterInfo(FLT1_FILTERINFO* entry);

    /// Bytes per row; set once, before the first row.
    void SetRowSize(unsigned bytes);
    /// Rows to make room for at a time, at least; room grows geometrically beyond that.
    void SetAllocationDefault(unsigned rows);
    unsigned AllocationDefault() const;

    /// The rows that are held now.
    int NumDataItems() const;
    int NumRowsAllocated() const;
    /// Row `index`, which must be held; valid until the next InsertRow() or ClearCount().
    char* Data(int index) const;
    /// Forgets the rows; their memory is kept for the next ones.
    void ClearCount();

    const char* ApplicationName() const;
    const char* TableName() const;
    /// Seconds between samples; 0 for a plain query.
    int Interval() const;
    /// 0 = plain query, 1 = subscription.
    int SampleType() const;
    /// Two numbers for traces: the object's own number, and how many handles to it are in use.
    unsigned ObjectNumber() const;
    unsigned UseCount() const;

    /// The object's handle, the number by which the framework knows it; never 0.
    unsigned long Handle() const;
    /// Keeps this object from being destroyed until Drop(). `handle` is the object's own; any
    /// other does nothing.
    void UseHandle(unsigned long handle);
    /// Ends the use that UseHandle() began. The object may be gone afterwards, if it is no longer
    /// live and this was its last use. Without a use it does nothing.
    void Drop();
    /// Hands the rows that are held to a live object's requester without waiting for it; without
    /// rows the requester is left alone. Returns 0, OXA_OVERFLOW or OXA_GONE. The rows of a plain
    /// query stay for its end.
    int Dispatch();

protected:
    /// Compares a character field of `length` bytes with a 0-terminated value. Both are taken as
    /// blank-padded to `length`, of the value at most `length` bytes count (of a pattern at most
    /// `length` besides its "*"). LIKE ignores the trailing blanks of both. Bytes are compared as
    /// unsigned numbers.
    static int IsException(_IntfOper op, const char* field, const char* value, int length);
    /// Compares an integer field with a value in decimal digits, with or without a sign and blanks
    /// around it; 0 when the value is no number. LIKE compares the field's digits as a text.
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
    /// The names are constant texts that outlive the manager. Managers of the same names share
    /// their live objects and the lock that guards them.
    TableManager(const char* application, const char* table);
    TableManager(const TableManager&) = delete;
    TableManager& operator=(const TableManager&) = delete;
    /// Takes a registered table back; no request on it may be running.
    virtual ~TableManager();

    /// Called by the framework when it stops serving the table through this manager, without locks.
    virtual void Shutdown(unsigned long reason);
    /// Makes the object of one request; the caller owns it. Null when memory is short.
    virtual rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) = 0;

    /// Offers the table to requesters from now on. A manager that was registered earlier under the
    /// same names is replaced and shut down, and its live objects move over. Returns 0 or a status.
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
    OxaTable& table_;  // what the framework keeps under the two names; never destroyed
};

/// Walks a manager's live objects in the order in which they came. The manager's lock is held from
/// before the iterator is made until after its last use.
class RtoxaListIter {
public:
    explicit RtoxaListIter(TableManager* manager);
    /// The next object, or null after the last one.
    rtoxa* Next();

private:
    rtoxa* next_;
};

/// The name of the node that this agent process stands for, 0-terminated; at most 64 bytes.
const char* OXA_GetOriginnode(const rtoxa* request);
