// The base class of requests: filter entries, rows, uses of handles and dispatch.

#include "platform/oxa.h"

#include <algorithm>
#include <climits>
#include <exception>

#include "oxa/internal.h"
#include "platform/ras1.h"

namespace {

RAS1_UNIT traceUnit{"oxa"};

unsigned nextObjectNumber() {
    static std::atomic<unsigned> last{0};
    const unsigned number = ++last;
    return number != 0 ? number : ++last;  // 0 is never a handle, not even after an overflow
}

/// Makes room for one more row. Room grows geometrically, by `step` rows at least.
void makeRoom(oxa::Rows& rows, std::size_t count, std::size_t& allocated, unsigned step) {
    if (count < allocated) return;
    const std::size_t wanted = allocated + std::max<std::size_t>(step, allocated);
    rows.bytes.reserve(wanted * rows.rowSize);
    allocated = wanted;
}

}  // namespace

rtoxa::rtoxa(RequestDetail* detail, ContextInfo* context, TableManager* manager)
    : state_(std::make_unique<State>(manager->table_, nextObjectNumber())) {
    if (detail != nullptr) state_->filter = detail->where;
    if (context != nullptr) {
        state_->sampleType = context->sampleType;
        state_->interval = context->interval;
    }
}

rtoxa::~rtoxa() = default;

void rtoxa::PrintSelf() {
    if ((RAS1_Flags(traceUnit) & RAS1_DETAIL) == 0) return;
    const RAS1_BLOCK block{&traceUnit, __func__};
    RAS1_Printf(&block, RAS1_DETAIL, __LINE__, "rtoxa @%p <%u,%u> appl=%s,table=%s,count=%d",
                static_cast<void*>(this), ObjectNumber(), UseCount(), ApplicationName(),
                TableName(), NumDataItems());
}

int rtoxa::NumColumns() {
    return 0;
}

int rtoxa::GetColumnInfo(ColumnInfo*, int) {
    return OXA_BAD_COLUMN;
}

int rtoxa::ExecuteCommand(char*, int, char*) {
    return OXA_FAILED;
}

void rtoxa::CommandCompleted(RtoxaAutomationCapsule*) {}

int rtoxa::InsertRow(char* row) {
    oxa::Rows& rows = state_->rows;
    const std::size_t count = rows.count();
    if (rows.rowSize == 0 || count >= INT_MAX) return OXA_NO_MEMORY;
    try {
        makeRoom(rows, count, state_->allocated, state_->allocationDefault);
        rows.bytes.append(row, rows.rowSize);
    } catch (const std::exception&) {
        return OXA_NO_MEMORY;
    }
    return OXA_OK;
}

int rtoxa::GetFilterInfo(FLT1_FILTERINFO* entry) {
    if (state_->nextEntry >= state_->filter.size()) return OXA_END_OF_FILTER;
    const oxa::Predicate& predicate = state_->filter[state_->nextEntry++];
    entry->columnName = predicate.column.c_str();
    entry->op = predicate.op;
    entry->value = predicate.value.c_str();
    entry->valueLength = static_cast<unsigned>(predicate.value.size());
    return OXA_OK;
}

void rtoxa::SetRowSize(unsigned bytes) {
    state_->rows.rowSize = bytes;
}

void rtoxa::SetAllocationDefault(unsigned rows) {
    state_->allocationDefault = std::max(rows, 1U);
}

unsigned rtoxa::AllocationDefault() const {
    return state_->allocationDefault;
}

int rtoxa::NumDataItems() const {
    return static_cast<int>(state_->rows.count());
}

int rtoxa::NumRowsAllocated() const {
    return static_cast<int>(std::min<std::size_t>(state_->allocated, INT_MAX));
}

char* rtoxa::Data(int index) const {
    oxa::Rows& rows = state_->rows;
    return rows.bytes.data() + static_cast<std::size_t>(index) * rows.rowSize;
}

void rtoxa::ClearCount() {
    state_->rows.bytes.clear();
}

const char* rtoxa::ApplicationName() const {
    return state_->table.application.c_str();
}

const char* rtoxa::TableName() const {
    return state_->table.name.c_str();
}

int rtoxa::Interval() const {
    return state_->interval;
}

int rtoxa::SampleType() const {
    return state_->sampleType;
}

unsigned rtoxa::ObjectNumber() const {
    return state_->number;
}

unsigned rtoxa::UseCount() const {
    return state_->references.load(std::memory_order_relaxed) / 2;
}

unsigned long rtoxa::Handle() const {
    return state_->number;
}

void rtoxa::UseHandle(unsigned long handle) {
    if (handle == Handle()) state_->references.fetch_add(2, std::memory_order_relaxed);
}

void rtoxa::Drop() {
    std::atomic<unsigned>& references = state_->references;
    unsigned before = references.load(std::memory_order_relaxed);
    do {
        if (before < 2) return;
    } while (!references.compare_exchange_weak(before, before - 2, std::memory_order_acq_rel));
    if (before == 2) delete this;
}

int rtoxa::Dispatch() {
    if (state_->sampleType == 0) return OXA_OK;
    const std::lock_guard<std::mutex> lock(state_->sinkLock);
    if (!state_->sink) return OXA_GONE;
    if (state_->rows.count() == 0) return OXA_OK;
    try {
        return state_->sink(state_->rows);
    } catch (...) {
        return OXA_OVERFLOW;
    }
}

void oxa::Release::operator()(rtoxa* object) const {
    const unsigned before =
        OxaAccess::state(*object).references.fetch_and(~1U, std::memory_order_acq_rel);
    if (before == 1) delete object;
}
