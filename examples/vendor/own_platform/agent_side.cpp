// What the agent uses: queries and subscriptions.

#include "own_platform/tables.h"

#include <algorithm>
#include <utility>

#include "own_platform/framework.h"

namespace {

/// Ends the framework's hold on an object, which is destroyed now or by its last Drop().
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
    TableManager* const manager = vendor::managerOf(table);
    if (manager == nullptr) return nullptr;
    RequestDetail detail{where};
    ContextInfo context{isSubscription};
    return Object(manager->CreateRtoxa(&detail, &context));
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

std::vector<vendor::Column> vendor::columnsOf(const std::string& table) {
    const Object object = makeObject(table, {}, false);
    return object ? vendor::columnsOf(*object) : std::vector<Column>();
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
