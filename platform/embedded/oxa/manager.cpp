// Table managers, the registry of tables, and iteration over live objects.
//
// The registry's lock comes last in the lock order and is never held while foreign code runs.

#include <map>
#include <utility>

#include "oxa/internal.h"

namespace {

struct Registry {
    std::mutex lock;
    std::map<std::pair<std::string, std::string>, std::unique_ptr<OxaTable>> tables;
    std::vector<OxaTable*> registered;  ///< in the order of their first registration
};

Registry& registry() {
    static Registry& instance = *new Registry;  // never destroyed: threads use it until the end
    return instance;
}

std::string textOrEmpty(const char* text) {
    return text != nullptr ? text : "";
}

}  // namespace

OxaTable& oxa::tableNamed(const std::string& application, const std::string& table) {
    Registry& known = registry();
    const std::lock_guard<std::mutex> lock(known.lock);
    std::unique_ptr<OxaTable>& entry = known.tables[{application, table}];
    if (!entry) entry = std::make_unique<OxaTable>(application, table);
    return *entry;
}

oxa::Offer oxa::offerOf(const std::string& table) {
    Registry& known = registry();
    const std::lock_guard<std::mutex> lock(known.lock);
    for (OxaTable* candidate : known.registered) {
        if (candidate->manager != nullptr && candidate->name == table) {
            return {candidate, candidate->manager};
        }
    }
    return {};
}

std::vector<oxa::Offer> oxa::offers() {
    Registry& known = registry();
    const std::lock_guard<std::mutex> lock(known.lock);
    std::vector<Offer> found;
    for (OxaTable* table : known.registered) {
        if (table->manager != nullptr) found.push_back({table, table->manager});
    }
    return found;
}

void oxa::rememberColumns(const Offer& offer, const std::vector<Column>& columns) {
    const std::lock_guard<std::mutex> lock(registry().lock);
    if (offer.table->manager != offer.manager) return;
    offer.table->columns = columns;
    offer.table->columnsKnown = true;
}

bool oxa::recallColumns(const Offer& offer, std::vector<Column>& columns) {
    const std::lock_guard<std::mutex> lock(registry().lock);
    if (offer.table->manager != offer.manager || !offer.table->columnsKnown) return false;
    columns = offer.table->columns;
    return true;
}

TableManager::TableManager(const char* application, const char* table)
    : table_(oxa::tableNamed(textOrEmpty(application), textOrEmpty(table))) {}

TableManager::~TableManager() {
    const std::lock_guard<std::mutex> lock(registry().lock);
    if (table_.manager == this) {
        table_.manager = nullptr;
        table_.columnsKnown = false;
    }
}

void TableManager::Shutdown(unsigned long) {}

int TableManager::RegisterWithManager() {
    TableManager* replaced = nullptr;
    try {
        Registry& known = registry();
        const std::lock_guard<std::mutex> lock(known.lock);
        bool isNew = true;
        for (const OxaTable* table : known.registered)
            isNew = isNew && table != &table_;
        if (isNew) known.registered.push_back(&table_);
        replaced = std::exchange(table_.manager, this);
        if (replaced != this) table_.columnsKnown = false;
    } catch (const std::bad_alloc&) {
        return OXA_NO_MEMORY;
    }
    if (replaced != nullptr && replaced != this) replaced->Shutdown(0);
    return OXA_OK;
}

void TableManager::lock() {
    table_.liveLock.lock();
    oxa::tableLocked();
}

void TableManager::unlock() {
    table_.liveLock.unlock();
    oxa::tableUnlocked();
}

const char* TableManager::ApplicationName() const {
    return table_.application.c_str();
}

const char* TableManager::TableName() const {
    return table_.name.c_str();
}

RtoxaListIter::RtoxaListIter(TableManager* manager) : next_(manager->table_.first) {}

rtoxa* RtoxaListIter::Next() {
    rtoxa* const current = next_;
    if (current != nullptr) next_ = current->state_->next;
    return current;
}
