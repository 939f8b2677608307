// Requests to the host: whatever comes is answered, every answer is a JSON document with one of the
// statuses that the interface knows, and events come only from streams that can be opened. An input
// is a line "METHOD TARGET" and the body.

#include <nlohmann/json.hpp>

#include "conformance/sample_table.h"
#include "host/api/api.h"
#include "host/api/routes.h"
#include "host/api/services.h"
#include "support/fuzz_support.h"

using fuzz::require;
using http::Answer;
using http::EventSource;
using http::Job;
using http::Reply;
using http::Request;
using nlohmann::json;

namespace {

constexpr std::size_t kRows = 4;

SampleManager& table() {
    static SampleManager& manager = *new SampleManager;
    return manager;
}

/// The interface on one table with a few rows; it lives as long as the process.
host::Api& api() {
    static host::Api& made = *[] {
        table().sample = {sampleRow("one", 1, "first"), sampleRow("two", -2, "\xC3\xA9\xFF"),
                          sampleRow("", 0, "a*b"), sampleRow("three", 2147483647)};
        require(table().sample.size() == kRows, "all rows are there");
        require(table().RegisterWithManager() == OXA_OK, "the table is offered");
        auto& services = *new host::Services(oxa::tables(), host::CodePage("UTF-8"), "/home");
        return new host::Api(services, host::routes());
    }();
    return made;
}

Answer answerTo(Request request) {
    auto handled = api().handle(std::move(request));
    if (auto* const job = std::get_if<Job>(&handled)) return (*job)();
    return std::get<Answer>(std::move(handled));
}

void checkError(const Reply& reply, const json& document) {
    require(reply.status == 400 || reply.status == 404 || reply.status == 405,
            "a refusal has one of three statuses");
    require(!document.at("error").get<std::string>().empty(), "a refusal says why");
    require(reply.fields.empty() == (reply.status != 405), "a wrong method says the right one");
}

void checkReply(const Reply& reply) {
    if (reply.status == 204) {
        require(reply.body.empty() && !reply.fields.empty(), "methods stand in the head alone");
        return;
    }
    const json document = json::parse(reply.body);
    if (reply.status != 200) return checkError(reply, document);
    if (document.contains("rows"))
        require(document.at("rows").size() <= kRows, "rows are those of the table");
}

/// A row that is published meanwhile is an event, or it is not what the stream is for.
void checkStream(EventSource& source) {
    require(source.empty(), "a stream begins with nothing");
    require(table().publish(sampleRow("two", -2, "\xC3\xA9\xFF")) == OXA_OK, "streams take rows");
    const std::string text = source.take();
    require(text.empty() || text.find("data: {\"NAME\":\"two\",\"VALUE\":-2,") == 0,
            "an event shows its row");
    require(source.empty(), "what was taken is gone");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::string_view line = input.line();
    const std::size_t blank = std::min(line.find(' '), line.size());
    const std::string_view target = line.substr(std::min(blank + 1, line.size()));
    const Answer answer = answerTo({std::string(line.substr(0, blank)),
                                    std::string(target),
                                    std::string(input.rest()),
                                    {0, 0, 0, http::Access::Act}});
    if (const auto* const reply = std::get_if<Reply>(&answer)) {
        checkReply(*reply);
    } else {
        checkStream(*std::get<std::unique_ptr<EventSource>>(answer));
    }
    return 0;
}
