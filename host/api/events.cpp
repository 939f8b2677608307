// GET /v1/events
//
// Each row is one event, "data: {...}", in the order in which the rows came. When the client reads
// too slowly and rows are lost, one event "event: overflow" with "data: {"lost": N}" stands in
// their place and the stream goes on: whoever waits for one outcome still gets it.

#include "host/api/call.h"
#include "host/api/services.h"
#include "host/tables/conditions.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"

namespace host {
namespace {

class RowEvents final : public EventSource {
public:
    /// `table` and `codePage` outlive the source.
    RowEvents(const oxa::Table& table, const CodePage& codePage, RowQueue::Limits limits)
        : table_(table), codePage_(codePage), queue_(std::make_shared<RowQueue>(limits)) {}

    /// Opens the subscription: rows are kept from now on. False when the table takes none. Runs the
    /// table's code.
    bool subscribe(const std::vector<oxa::Predicate>& where, OutcomeFeed& outcomes) {
        const auto sink = [queue = queue_](const oxa::Rows& rows) { return queue->push(rows); };
        if (table_.name == plugin::kOutcomeTable) {
            outcome_ = outcomes.subscribe(where, sink);
            return outcome_ != nullptr;
        }
        own_ = oxa::subscribe(table_.name, where, sink);
        return own_ != nullptr;
    }

    void start(std::function<void()> wake) override { queue_->onContent(std::move(wake)); }
    bool empty() const override { return queue_->empty(); }
    std::string take() override {
        const RowQueue::Batch batch = queue_->take();
        std::string text;
        for (std::size_t i = 0; i < batch.rows.count(); ++i) {
            appendEvent(text, {rowDocument(table_, rowOf(batch.rows, i), codePage_), {}, {}});
        }
        if (batch.lost > 0) {
            appendEvent(text, {"{\"lost\":" + std::to_string(batch.lost) + "}", "overflow", {}});
        }
        return text;
    }

private:
    const oxa::Table& table_;
    const CodePage& codePage_;
    const std::shared_ptr<RowQueue> queue_;
    // One of the two: outcomes come through the feed, rows of other tables directly.
    std::unique_ptr<OutcomeFeed::Subscription> outcome_;
    std::unique_ptr<oxa::Subscription> own_;
};

}  // namespace

Endpoint getEvents;

Answer getEvents(Services& services, const Call& call) {
    const std::string& name = call.required("table");
    const oxa::Table* const table = services.tables.find(name);
    if (table == nullptr) return errorReply(404, "there is no table \"" + name + "\"");
    const ConditionReader reader(*table, services.codePage);
    std::vector<oxa::Predicate> where;
    for (const auto& [column, text] : call.columns())
        where.push_back(reader.equality(column, text));
    auto source = std::make_unique<RowEvents>(*table, services.codePage, services.eventLimits);
    if (!source->subscribe(where, services.outcomes)) {
        return errorReply(500, "the table takes no subscription");
    }
    return Answer(std::move(source));
}

}  // namespace host
