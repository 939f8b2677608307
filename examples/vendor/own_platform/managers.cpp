// Table managers, the registry of tables, and iteration over live objects.

#include <unistd.h>

#include <algorithm>
#include <map>
#include <utility>

#include "own_platform/framework.h"

namespace {

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

}  // namespace

TableManager* vendor::managerOf(const std::string& name) {
    const std::lock_guard<std::mutex> guard(registry().lock);
    for (const auto& [names, table] : registry().tables) {
        if (names.second == name && table->manager != nullptr) return table->manager;
    }
    return nullptr;
}

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
