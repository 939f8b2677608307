// The base class of requests: filters, rows, uses of handles and dispatch.

#include <algorithm>
#include <atomic>
#include <cctype>
#include <exception>
#include <utility>

#include "own_platform/framework.h"
#include "platform/ras1.h"

namespace {

RAS1_UNIT traceUnit{"vendor-tables"};

}  // namespace

std::vector<vendor::Column> vendor::columnsOf(rtoxa& object) {
    std::vector<vendor::Column> columns;
    for (int i = 0; i < object.NumColumns(); ++i) {
        ColumnInfo info{};
        if (object.GetColumnInfo(&info, i) != OXA_OK || info.name == nullptr) continue;
        vendor::Column column{info.name, info.offset, info.length, info.type};
        for (char& c : column.name)
            c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
        columns.push_back(column);
    }
    return columns;
}

vendor::Rows vendor::rowsOf(const rtoxa& object) {
    vendor::Rows rows;
    const unsigned size = OxaAccess::state(object).rowSize;
    for (int i = 0; i < object.NumDataItems(); ++i)
        rows.emplace_back(object.Data(i), size);
    return rows;
}

rtoxa::rtoxa(RequestDetail* detail, ContextInfo* context, TableManager* manager)
    : state_(std::make_unique<State>()) {
    static std::atomic<unsigned> last{0};
    state_->number = ++last;
    state_->table = &manager->table_;
    if (detail != nullptr) state_->filter = detail->where;
    state_->isSubscription = context != nullptr && context->isSubscription;
}

rtoxa::~rtoxa() = default;

void rtoxa::PrintSelf() {
    if ((RAS1_Flags(traceUnit) & RAS1_DETAIL) == 0) return;
    const RAS1_BLOCK block{&traceUnit, __func__};
    RAS1_Printf(&block, RAS1_DETAIL, __LINE__, "request %u on %s, %d rows", ObjectNumber(),
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

int rtoxa::InsertRow(char* row) {
    if (state_->rowSize == 0) return OXA_FAILED;
    try {
        const std::size_t atLeast = std::size_t{state_->allocationDefault} * state_->rowSize;
        if (state_->rows.size() + state_->rowSize > state_->rows.capacity()) {
            state_->rows.reserve(std::max(atLeast, state_->rows.size()) + state_->rows.size());
        }
        state_->rows.append(row, state_->rowSize);
        return OXA_OK;
    } catch (const std::exception&) {  // out of memory, or longer than a text can be
        return OXA_NO_MEMORY;
    }
}

int rtoxa::CheckForException(char* row) {
    const std::vector<vendor::Column> columns = vendor::columnsOf(*this);
    for (vendor::Condition& entry : state_->filter) {
        const bool isKnown =
            std::any_of(columns.begin(), columns.end(),
                        [&](const vendor::Column& column) { return column.name == entry.column; });
        if (!isKnown) continue;
        if (ColumnIsException(entry.column.data(), row, entry.op, entry.value.data()) == 0) {
            return 0;
        }
    }
    return 1;
}

int rtoxa::ColumnIsException(char*, char*, _IntfOper, char*) {
    return 0;
}

void rtoxa::CommandCompleted(RtoxaAutomationCapsule*) {}

int rtoxa::GetFilterInfo(FLT1_FILTERINFO* entry) {
    if (state_->nextEntry == state_->filter.size()) return OXA_END_OF_FILTER;
    const vendor::Condition& next = state_->filter[state_->nextEntry++];
    *entry = {next.column.c_str(), next.op, next.value.c_str(),
              static_cast<unsigned>(next.value.size())};
    return OXA_OK;
}

void rtoxa::SetRowSize(unsigned bytes) {
    state_->rowSize = bytes;
}

void rtoxa::SetAllocationDefault(unsigned rows) {
    state_->allocationDefault = std::max(rows, 1U);
}

unsigned rtoxa::AllocationDefault() const {
    return state_->allocationDefault;
}

int rtoxa::NumDataItems() const {
    return state_->rowSize == 0 ? 0 : static_cast<int>(state_->rows.size() / state_->rowSize);
}

int rtoxa::NumRowsAllocated() const {
    return state_->rowSize == 0 ? 0 : static_cast<int>(state_->rows.capacity() / state_->rowSize);
}

char* rtoxa::Data(int index) const {
    return state_->rows.data() + static_cast<std::size_t>(index) * state_->rowSize;
}

void rtoxa::ClearCount() {
    state_->rows.clear();
}

const char* rtoxa::ApplicationName() const {
    return state_->table->application.c_str();
}

const char* rtoxa::TableName() const {
    return state_->table->name.c_str();
}

int rtoxa::Interval() const {
    return 0;
}

int rtoxa::SampleType() const {
    return state_->isSubscription ? 1 : 0;
}

unsigned rtoxa::ObjectNumber() const {
    return state_->number;
}

unsigned rtoxa::UseCount() const {
    const std::lock_guard<std::mutex> guard(state_->useLock);
    return state_->uses;
}

unsigned long rtoxa::Handle() const {
    return state_->number;
}

void rtoxa::UseHandle(unsigned long handle) {
    const std::lock_guard<std::mutex> guard(state_->useLock);
    if (handle == Handle()) ++state_->uses;
}

void rtoxa::Drop() {
    std::unique_lock<std::mutex> guard(state_->useLock);
    if (state_->uses == 0) return;
    const bool wasLast = --state_->uses == 0 && !state_->isKept;
    guard.unlock();
    if (wasLast) delete this;
}

int rtoxa::Dispatch() {
    if (!state_->isSubscription) return OXA_OK;
    const std::lock_guard<std::mutex> guard(state_->sinkLock);
    if (!state_->sink) return OXA_GONE;
    return NumDataItems() == 0 ? int{OXA_OK} : state_->sink(vendor::rowsOf(*this));
}
