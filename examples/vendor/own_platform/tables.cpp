// Tables, requests on them and the rows that answer, all in memory.

#include "own_platform/tables.h"

#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cctype>
#include <cstring>
#include <map>
#include <mutex>
#include <new>
#include <stdexcept>
#include <utility>

#include "platform/ras1.h"

/// What a request asks, on its way through the table's own classes.
struct RequestDetail {
    const vendor::Conditions& where;
};
struct ContextInfo {
    bool isSubscription;
};

/// What is known of a table under its two names, whoever manages it at the time.
struct OxaTable {
    std::string application;
    std::string name;
    std::mutex lock;                  ///< guards the list
    std::vector<rtoxa*> live;         ///< in the order in which they came
    TableManager* manager = nullptr;  ///< guarded by the registry's lock; null while not offered
};

struct rtoxa::State {
    OxaTable* table = nullptr;
    unsigned number = 0;
    bool isSubscription = false;
    vendor::Conditions filter;
    std::size_t nextEntry = 0;

    unsigned rowSize = 0;
    unsigned allocationDefault = 1;
    std::string rows;  ///< one behind the other

    std::mutex sinkLock;  ///< guards the sink and is held while it runs
    vendor::Sink sink;    ///< empty when nobody takes rows, or no longer

    std::mutex useLock;  ///< guards the two below
    unsigned uses = 0;
    bool isKept = true;  ///< by the framework
};

/// The framework's way to what an object keeps for it.
struct OxaAccess {
    static rtoxa::State& state(rtoxa& object) { return *object.state_; }
    static const rtoxa::State& state(const rtoxa& object) { return *object.state_; }
};

namespace {

RAS1_UNIT traceUnit{"vendor-tables"};

struct Registry {
    std::mutex lock;
    std::map<std::pair<std::string, std::string>, std::unique_ptr<OxaTable>> tables;
};

/// Never destroyed: the plug-in's thread uses its tables until the process ends.
Registry& registry() {
    static Registry& instance = *new Registry;
    return instance;
}

OxaTable& tableNamed(const std::string& application, const std::string& name) {
    const std::lock_guard<std::mutex> guard(registry().lock);
    std::unique_ptr<OxaTable>& table = registry().tables[{application, name}];
    if (!table) {
        table = std::make_unique<OxaTable>();
        table->application = application;
        table->name = name;
    }
    return *table;
}

TableManager* managerOf(const std::string& name) {
    const std::lock_guard<std::mutex> guard(registry().lock);
    for (const auto& [names, table] : registry().tables) {
        if (names.second == name && table->manager != nullptr) return table->manager;
    }
    return nullptr;
}

/// Ends the framework's hold on an object; it goes now, or with its last use.
struct LetGo {
    void operator()(rtoxa* object) const {
        auto& state = OxaAccess::state(*object);
        std::unique_lock<std::mutex> guard(state.useLock);
        state.isKept = false;
        const bool isUsed = state.uses > 0;
        guard.unlock();
        if (!isUsed) delete object;
    }
};
using Object = std::unique_ptr<rtoxa, LetGo>;

/// The object of a request on the table; null when there is no table, or no memory.
Object makeObject(const std::string& table, const vendor::Conditions& where, bool isSubscription) {
    TableManager* const manager = managerOf(table);
    if (manager == nullptr) return nullptr;
    RequestDetail detail{where};
    ContextInfo context{isSubscription};
    return Object(manager->CreateRtoxa(&detail, &context));
}

std::vector<vendor::Column> columnsOf(rtoxa& object) {
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

vendor::Rows rowsOf(const rtoxa& object) {
    vendor::Rows rows;
    const unsigned size = OxaAccess::state(object).rowSize;
    for (int i = 0; i < object.NumDataItems(); ++i)
        rows.emplace_back(object.Data(i), size);
    return rows;
}

class LiveSubscription final : public vendor::Subscription {
public:
    explicit LiveSubscription(Object object)
        : object_(std::move(object)), table_(*OxaAccess::state(*object_).table) {
        const std::lock_guard<std::mutex> guard(table_.lock);
        table_.live.push_back(object_.get());
    }
    ~LiveSubscription() override {
        {
            const std::lock_guard<std::mutex> guard(table_.lock);
            table_.live.erase(std::find(table_.live.begin(), table_.live.end(), object_.get()));
        }
        const std::lock_guard<std::mutex> guard(OxaAccess::state(*object_).sinkLock);
        OxaAccess::state(*object_).sink = nullptr;
    }

private:
    const Object object_;
    OxaTable& table_;
};

}  // namespace

// ---- The agent's side --------------------------------------------------------------------------

std::vector<vendor::Column> vendor::columnsOf(const std::string& table) {
    const Object object = makeObject(table, {}, false);
    return object ? ::columnsOf(*object) : std::vector<Column>();
}

int vendor::query(const std::string& table, const Conditions& where, Rows& rows) {
    rows.clear();
    if (managerOf(table) == nullptr) return OXA_GONE;
    const Object object = makeObject(table, where, false);
    if (!object) return OXA_NO_MEMORY;
    const int status = object->TakeSample();
    rows = rowsOf(*object);
    return status;
}

std::unique_ptr<vendor::Subscription> vendor::subscribe(const std::string& table,
                                                        const Conditions& where, Sink sink) {
    Object object = makeObject(table, where, true);
    if (!object) return nullptr;
    OxaAccess::state(*object).sink = std::move(sink);
    return std::make_unique<LiveSubscription>(std::move(object));
}

// ---- Requests ----------------------------------------------------------------------------------

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
    const std::vector<vendor::Column> columns = columnsOf(*this);
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
    return NumDataItems() == 0 ? int{OXA_OK} : state_->sink(rowsOf(*this));
}

// ---- Managers ----------------------------------------------------------------------------------

TableManager::TableManager(const char* application, const char* table)
    : table_(tableNamed(application, table)) {}

TableManager::~TableManager() {
    const std::lock_guard<std::mutex> guard(registry().lock);
    if (table_.manager == this) table_.manager = nullptr;
}

void TableManager::Shutdown(unsigned long) {}

int TableManager::RegisterWithManager() {
    TableManager* before = nullptr;
    {
        const std::lock_guard<std::mutex> guard(registry().lock);
        before = std::exchange(table_.manager, this);
    }
    if (before != nullptr && before != this) before->Shutdown(0);
    return OXA_OK;
}

void TableManager::lock() {
    table_.lock.lock();
}

void TableManager::unlock() {
    table_.lock.unlock();
}

const char* TableManager::ApplicationName() const {
    return table_.application.c_str();
}

const char* TableManager::TableName() const {
    return table_.name.c_str();
}

RtoxaListIter::RtoxaListIter(TableManager* manager)
    : next_(manager->table_.live.empty() ? nullptr : manager->table_.live.front()) {}

rtoxa* RtoxaListIter::Next() {
    rtoxa* const current = next_;
    if (current == nullptr) return nullptr;
    const std::vector<rtoxa*>& live = OxaAccess::state(*current).table->live;
    const auto after = std::find(live.begin(), live.end(), current) + 1;
    next_ = after == live.end() ? nullptr : *after;
    return current;
}

const char* OXA_GetOriginnode(const rtoxa*) {
    static const std::string node = [] {
        char name[65] = "";
        ::gethostname(name, sizeof name - 1);
        return std::string(name);
    }();
    return node.c_str();
}
