// Requests to the host: what is not refused names the table's columns and can be run, and every
// answer is a JSON document. An input is a line "METHOD TARGET" and the body.

#include <nlohmann/json.hpp>

#include "host/api/router.h"
#include "host/tables/json_documents.h"
#include "conformance/sample_table.h"
#include "support/fuzz_support.h"

using fuzz::require;
using nlohmann::json;

namespace {

constexpr std::size_t kRows = 4;

/// The table and its rows; it lives as long as the process.
const host::Router& router() {
    static SampleManager& manager = *new SampleManager;
    static const host::Router& made = *[] {
        manager.sample = {sampleRow("one", 1, "first"), sampleRow("two", -2, "\xC3\xA9\xFF"),
                          sampleRow("", 0, "a*b"), sampleRow("three", 2147483647)};
        require(manager.sample.size() == kRows, "all rows are there");
        return new host::Router(oxa::tables(), host::CodePage("UTF-8"));
    }();
    return made;
}

void checkQuery(const oxa::Table& table, const std::vector<oxa::Predicate>& where) {
    for (const oxa::Predicate& predicate : where) {
        require(table.find(predicate.column) != nullptr, "conditions are on columns of the table");
        require(predicate.value.find('\0') == std::string::npos, "values have no terminator");
    }
    oxa::Rows rows;
    require(oxa::query(table.name, where, rows) == OXA_OK, "every condition can be run");
    require(rows.count() <= kRows && (!where.empty() || rows.count() == kRows),
            "rows are those of the table");
    const json document = json::parse(rowsDocument(table, rows, router().codePage()));
    require(document.at("rows").size() == rows.count(), "every row is shown");
}

void checkRefusal(const host::Refusal& refusal) {
    require(refusal.status == 400 || refusal.status == 404 || refusal.status == 405,
            "a refusal has one of three statuses");
    require(!refusal.text.empty(), "a refusal says why");
    require(refusal.allow.empty() == (refusal.status != 405), "a wrong method says the right one");
    require(json::parse(host::errorDocument(refusal.text)).contains("error"),
            "a refusal is a document");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::string_view line = input.line();
    const std::size_t blank = std::min(line.find(' '), line.size());
    const std::string_view target = line.substr(std::min(blank + 1, line.size()));
    const host::Request request = router().route(line.substr(0, blank), target, input.rest());
    if (const auto* const query = std::get_if<host::QueryRequest>(&request)) {
        checkQuery(*query->table, query->where);
    } else if (const auto* const events = std::get_if<host::EventsRequest>(&request)) {
        checkQuery(*events->table, events->where);
    } else if (const auto* const refusal = std::get_if<host::Refusal>(&request)) {
        checkRefusal(*refusal);
    }
    return 0;
}
