#include "fleet/bus/nats/store.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/nats/api.h"

namespace fleet {

namespace {

constexpr int kWrongLastSequence = 10071;

StoreResult storeFailure(BusStatus status) {
    using Kind = StoreResult::Kind;
    StoreResult result;
    result.code = status.code;
    result.text = std::move(status.text);
    switch (status.kind) {
        case BusStatus::Kind::NoAnswer:
            result.kind = Kind::NoAnswer;
            break;
        case BusStatus::Kind::Forbidden:
            result.kind = Kind::Forbidden;
            break;
        default:
            result.kind = status.code == kWrongLastSequence ? Kind::Occupied : Kind::Refused;
    }
    return result;
}

BusHeaders expecting(std::uint64_t lastSequence) {
    return {{"Nats-Expected-Last-Subject-Sequence", std::to_string(lastSequence)}};
}

StoreResult storeResultOf(ApiAnswer answer) {
    if (!answer.status.done()) return storeFailure(std::move(answer.status));
    const auto json = nlohmann::json::parse(answer.json);
    const auto sequence = json.find("seq");
    if (sequence == json.end() || !sequence->is_number_unsigned()) {
        return storeFailure(BusStatus::refused(0, "no stream has acknowledged it"));
    }
    StoreResult result;
    result.sequence = sequence->get<std::uint64_t>();
    return result;
}

StoreResult storeWith(Connection& connection, const std::string& subject, std::string_view bytes,
                      Connection::Milliseconds deadline, const BusHeaders& headers) {
    return storeResultOf(publishToStore(connection, subject, bytes, deadline, headers));
}

LastResult lastFailure(LastResult::Kind kind, std::string text) {
    LastResult result;
    result.kind = kind;
    result.text = std::move(text);
    return result;
}

/// The value of a header that the server adds; nullptr if the sender has written one as well.
const std::string* onlyHeader(const BusMessage& message, const std::string& name) {
    const auto isIt = [&](const auto& header) { return header.first == name; };
    const auto& headers = message.headers;
    if (std::count_if(headers.begin(), headers.end(), isIt) != 1) return nullptr;
    return message.header(name);
}

bool readSequence(const std::string* text, std::uint64_t& sequence) {
    if (text == nullptr) return false;
    const char* end = text->data() + text->size();
    const auto read = std::from_chars(text->data(), end, sequence);
    return read.ec == std::errc() && read.ptr == end;
}

/// What a store says of the last message on a subject.
LastResult lastResultOf(Connection::Reply reply, const std::string& subject) {
    using Kind = LastResult::Kind;
    switch (reply.status.kind) {
        case BusStatus::Kind::Done:
            break;
        case BusStatus::Kind::NoAnswer:
            return lastFailure(Kind::NoAnswer, reply.status.text);
        case BusStatus::Kind::Forbidden:
            return lastFailure(Kind::Forbidden, reply.status.text);
        case BusStatus::Kind::Refused:
            return lastFailure(Kind::Refused, reply.status.text);
    }
    const std::string* status = reply.message.header("Status");
    // Each message that is found has this; its sender may have given it a status, too.
    if (reply.message.header("Nats-Sequence") == nullptr && status != nullptr) {
        return lastFailure(*status == "404" ? Kind::Missing : Kind::Refused,
                           "the store says " + *status);
    }
    LastResult result;
    const std::string* onSubject = onlyHeader(reply.message, "Nats-Subject");
    if (onSubject == nullptr || *onSubject != subject ||
        !readSequence(onlyHeader(reply.message, "Nats-Sequence"), result.sequence)) {
        return lastFailure(Kind::Refused, "the answer is not the store's");
    }
    if (const auto* at = onlyHeader(reply.message, "Nats-Time-Stamp")) result.storedAt = *at;
    result.bytes = std::move(reply.message.data);
    return result;
}

std::string erasure(std::uint64_t sequence) {
    return nlohmann::json{{"seq", sequence}, {"no_erase", true}}.dump();
}

}  // namespace

StoreResult storeFirst(Connection& connection, const std::string& subject, std::string_view bytes,
                       Connection::Milliseconds deadline) {
    return storeAfter(connection, subject, bytes, 0, deadline);
}

StoreResult storeAfter(Connection& connection, const std::string& subject, std::string_view bytes,
                       std::uint64_t lastSequence, Connection::Milliseconds deadline) {
    return storeWith(connection, subject, bytes, deadline, expecting(lastSequence));
}

std::vector<StoreResult> storeFirst(Connection& connection,
                                    const std::vector<StoreRequest>& messages,
                                    Connection::Milliseconds deadline) {
    std::vector<Connection::Request> requests;
    for (const StoreRequest& message : messages)
        requests.push_back({message.subject, message.bytes, expecting(0)});
    std::vector<StoreResult> results;
    for (ApiAnswer& answer : publishToStore(connection, requests, deadline))
        results.push_back(storeResultOf(std::move(answer)));
    return results;
}

StoreResult store(Connection& connection, const std::string& subject, std::string_view bytes,
                  Connection::Milliseconds deadline) {
    return storeWith(connection, subject, bytes, deadline, {});
}

LastResult lastOn(Connection& connection, const std::string& stream, const std::string& subject,
                  Connection::Milliseconds deadline) {
    return std::move(
        lastOn(connection, stream, std::vector<std::string>{subject}, deadline).front());
}

std::vector<LastResult> lastOn(Connection& connection, const std::string& stream,
                               const std::vector<std::string>& subjects,
                               Connection::Milliseconds deadline) {
    std::vector<Connection::Request> requests;
    for (const std::string& subject : subjects)
        requests.push_back({"$JS.API.DIRECT.GET." + stream + "." + subject, "", {}});
    std::vector<Connection::Reply> replies = connection.requestAll(requests, deadline);
    std::vector<LastResult> results;
    for (std::size_t i = 0; i < subjects.size(); ++i)
        results.push_back(lastResultOf(std::move(replies[i]), subjects[i]));
    return results;
}

BusStatus erase(Connection& connection, const std::string& stream, std::uint64_t sequence,
                Connection::Milliseconds deadline) {
    return askStore(connection, "STREAM.MSG.DELETE." + stream, erasure(sequence), deadline).status;
}

std::vector<BusStatus> erase(Connection& connection, const std::string& stream,
                             const std::vector<std::uint64_t>& sequences,
                             Connection::Milliseconds deadline) {
    std::vector<std::string> questions;
    for (const std::uint64_t sequence : sequences)
        questions.push_back(erasure(sequence));
    std::vector<BusStatus> statuses;
    for (ApiAnswer& answer :
         askStore(connection, "STREAM.MSG.DELETE." + stream, questions, deadline)) {
        statuses.push_back(std::move(answer.status));
    }
    return statuses;
}

}  // namespace fleet
