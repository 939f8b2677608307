// The host's side of the framework: plain queries and live subscriptions.

#include "embedded/oxa_host.h"

#include <unistd.h>

#include <set>
#include <utility>

#include "oxa/internal.h"

namespace oxa {
namespace {

constexpr std::size_t kOriginNodeLength = 64;

std::string hostName() {
    char name[256] = "";
    if (::gethostname(name, sizeof name - 1) != 0) return {};
    return std::string(name).substr(0, kOriginNodeLength);
}

/// The origin node. Earlier names are kept, because callers may still hold pointers to them.
class OriginNode {
public:
    OriginNode() : current_(&*names_.insert(hostName()).first) {}
    void set(const std::string& name) {
        const std::lock_guard<std::mutex> lock(lock_);
        current_ = &*names_.insert(name.substr(0, kOriginNodeLength)).first;
    }
    const char* get() const { return current_.load()->c_str(); }

private:
    std::mutex lock_;
    std::set<std::string> names_;
    std::atomic<const std::string*> current_;
};

OriginNode& node() {
    static OriginNode& instance = *new OriginNode;  // never destroyed: requests run until the end
    return instance;
}

/// Makes the object of a request; null if the table is short of memory. Passes on whatever the
/// table's code throws.
OwnedObject createObject(const Offer& offer, const std::vector<Predicate>& where,
                         ContextInfo context) {
    RequestDetail detail{where};
    return OwnedObject(offer.manager->CreateRtoxa(&detail, &context));
}

class LiveSubscription final : public Subscription {
public:
    /// Appends the object to its table's list of live objects.
    explicit LiveSubscription(OwnedObject object) : object_(std::move(object)) {
        OxaAccess::State& state = OxaAccess::state(*object_);
        OxaTable& table = state.table;
        const std::lock_guard<std::mutex> lock(table.liveLock);
        state.previous = table.last;
        (table.last != nullptr ? OxaAccess::state(*table.last).next : table.first) = object_.get();
        table.last = object_.get();
    }
    ~LiveSubscription() override {
        unlink();
        silence();
    }

private:
    void unlink() {
        OxaAccess::State& state = OxaAccess::state(*object_);
        OxaTable& table = state.table;
        const std::lock_guard<std::mutex> lock(table.liveLock);
        (state.previous != nullptr ? OxaAccess::state(*state.previous).next : table.first) =
            state.next;
        (state.next != nullptr ? OxaAccess::state(*state.next).previous : table.last) =
            state.previous;
    }
    /// Waits for a dispatch that is running. Later ones find no requester.
    void silence() {
        OxaAccess::State& state = OxaAccess::state(*object_);
        Sink gone;
        const std::lock_guard<std::mutex> lock(state.sinkLock);
        gone.swap(state.sink);
    }

    const OwnedObject object_;
};

/// Asks an object of the table that is never sampled and never on its list of live objects.
class ObjectFilter final : public Filter {
public:
    ObjectFilter(OwnedObject object, unsigned rowSize)
        : object_(std::move(object)), row_(rowSize, ' ') {}
    bool takes(const char* row) override {
        row_.assign(row, row_.size());  // tables are handed rows that they may write to
        return object_->CheckForException(row_.data()) == 1;
    }

private:
    const OwnedObject object_;
    std::string row_;
};

}  // namespace

const Column* Table::find(const std::string& column) const {
    for (const Column& candidate : columns) {
        if (candidate.name == column) return &candidate;
    }
    return nullptr;
}

void setOriginNode(const std::string& name) {
    node().set(name);
}

std::string originNode() {
    return node().get();
}

std::vector<Table> tables() {
    std::vector<Table> found;
    for (const Offer& offer : offers()) {
        Table table{offer.table->application, offer.table->name, {}};
        if (!recallColumns(offer, table.columns)) {
            try {
                if (const OwnedObject object = createObject(offer, {}, {})) {
                    table.columns = columnsOf(*object);
                    rememberColumns(offer, table.columns);
                }
            } catch (...) {
                // A table that cannot answer now is listed without columns and asked again later.
                table.columns.clear();
            }
        }
        found.push_back(std::move(table));
    }
    return found;
}

int query(const std::string& table, const std::vector<Predicate>& where, Rows& rows) {
    rows = {};
    const Offer offer = offerOf(table);
    if (offer.manager == nullptr) return OXA_GONE;
    try {
        const OwnedObject object = createObject(offer, where, {});
        if (!object) return OXA_NO_MEMORY;
        const int status = object->TakeSample();
        rows = std::move(OxaAccess::state(*object).rows);
        return status;
    } catch (const std::bad_alloc&) {
        return OXA_NO_MEMORY;
    } catch (...) {
        return OXA_FAILED;
    }
}

std::unique_ptr<Subscription> subscribe(const std::string& table,
                                        const std::vector<Predicate>& where, Sink sink) {
    const Offer offer = offerOf(table);
    if (offer.manager == nullptr) return nullptr;
    try {
        ContextInfo context;
        context.sampleType = 1;
        OwnedObject object = createObject(offer, where, context);
        if (!object) return nullptr;
        OxaAccess::state(*object).sink = std::move(sink);
        return std::make_unique<LiveSubscription>(std::move(object));
    } catch (...) {
        return nullptr;
    }
}

std::unique_ptr<Filter> makeFilter(const std::string& table, const std::vector<Predicate>& where) {
    const Offer offer = offerOf(table);
    if (offer.manager == nullptr) return nullptr;
    try {
        ContextInfo context;
        context.sampleType = 1;
        OwnedObject object = createObject(offer, where, context);
        if (!object) return nullptr;
        const unsigned rowSize = OxaAccess::state(*object).rows.rowSize;
        return std::make_unique<ObjectFilter>(std::move(object), rowSize);
    } catch (...) {
        return nullptr;
    }
}

}  // namespace oxa

const char* OXA_GetOriginnode(const rtoxa*) {
    return oxa::node().get();
}
