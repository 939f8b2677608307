// GET /v1/events
//
// Each row is one event, "data: {...}", in the order in which the rows came. Outcomes come from the
// journal, so a slow reader loses none. Rows of other tables are not kept: when their reader is too
// slow, one event "event: overflow" with "data: {"lost": N}" stands in the place of those that are
// lost, and the stream goes on.

#include "host/api/events/outcome_events.h"
#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/tables/conditions.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"
#include "routes/bad_request.h"

namespace host {
namespace {

class RowEvents final : public http::EventSource {
public:
    /// `table` and `codePage` outlive the source.
    RowEvents(const oxa::Table& table, const CodePage& codePage, RowQueue::Limits limits)
        : table_(table), codePage_(codePage), queue_(std::make_shared<RowQueue>(limits)) {}

    /// Opens the subscription: rows are kept from now on. False when the table takes none. Runs the
    /// table's code.
    bool subscribe(const std::vector<oxa::Predicate>& where) {
        subscription_ = oxa::subscribe(table_.name, where, [queue = queue_](const oxa::Rows& rows) {
            return queue->push(rows);
        });
        return subscription_ != nullptr;
    }

    void start(std::function<void()> wake) override { queue_->onContent(std::move(wake)); }
    bool empty() const override { return queue_->empty(); }
    std::string take() override {
        const RowQueue::Batch batch = queue_->take();
        std::string text;
        for (std::size_t i = 0; i < batch.rows.count(); ++i) {
            http::appendEvent(text, {rowDocument(table_, rowOf(batch.rows, i), codePage_), {}, {}});
        }
        if (batch.lost > 0) {
            http::appendEvent(text,
                              {"{\"lost\":" + std::to_string(batch.lost) + "}", "overflow", {}});
        }
        return text;
    }

private:
    const oxa::Table& table_;
    const CodePage& codePage_;
    const std::shared_ptr<RowQueue> queue_;
    std::unique_ptr<oxa::Subscription> subscription_;
};

std::unique_ptr<http::EventSource> rowEvents(Services& services, const oxa::Table& table,
                                             const std::vector<oxa::Predicate>& where) {
    auto source = std::make_unique<RowEvents>(table, services.codePage, services.eventLimits);
    if (!source->subscribe(where)) return nullptr;
    return source;
}

/// Rows of other tables have no identifiers.
void checkOutcomeParameters(const Call& call, const std::string& table) {
    for (const char* const name : {"after", "tasks"}) {
        if (call.text(name) != nullptr && table != plugin::kOutcomeTable) {
            throw routes::BadRequest("\"" + std::string(name) + "\" goes with the table " +
                                     std::string(plugin::kOutcomeTable) + " only");
        }
    }
}

}  // namespace

Endpoint getEvents;
Schema overflowSchema;

http::Answer getEvents(Services& services, const Call& call) {
    const std::string& name = call.required("table");
    const oxa::Table* const table = services.tables.find(name);
    if (table == nullptr) return http::errorReply(404, "there is no table \"" + name + "\"");
    if (name == plugin::kRequestTable && call.peer().access < http::Access::Act) {
        return http::errorReply(403,
                                "you may only read from this host; " + name + " takes requests");
    }
    if (name == plugin::kOutcomeTable && call.peer().access < http::Access::Act) {
        for (const auto& [column, text] : call.columns()) {
            if (!plugin::holdsFreeText(column)) continue;
            return http::errorReply(403, "you may only read from this host, and what is in " +
                                             column + " is not shown to you as it is");
        }
    }
    const ConditionReader reader(*table, services.codePage);
    std::vector<oxa::Predicate> where;
    for (const auto& [column, text] : call.columns())
        where.push_back(reader.equality(column, text));
    checkOutcomeParameters(call, name);
    auto source = name == plugin::kOutcomeTable
                      ? outcomeEvents(services, *table,
                                      {std::move(where), call.flag("tasks"),
                                       outputsFor(call.peer()), call.after()})
                      : rowEvents(services, *table, where);
    if (!source) return http::errorReply(500, "the table takes no subscription");
    return http::Answer(std::move(source));
}

nlohmann::ordered_json overflowSchema(Components&) {
    return shape::object(
        "Overflow", "The reader was too slow.",
        {{"lost", shape::wholeNumber("how much is missing here: rows, or bytes of output", 1)}});
}

}  // namespace host
