// GET /v1/files/{sha256}/content: a host fetches a file that one of its open orders names.

#include <algorithm>
#include <charconv>
#include <string_view>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getFileContent;

namespace {

constexpr std::size_t kMostBytes = std::size_t{512} * 1024;  ///< of one answer
constexpr std::size_t kMostOpen = 1000;

struct Range {
    std::uint64_t from = 0;
    std::size_t most = kMostBytes;
};

/// The one range in "bytes=FROM-" or "bytes=FROM-LAST". Anything else stands for the beginning, as
/// without the field: a server may pass over what it does not know.
Range rangeIn(std::string_view field) {
    constexpr std::string_view kUnit = "bytes=";
    if (field.substr(0, kUnit.size()) != kUnit) return {};
    const char* const end = field.data() + field.size();
    std::uint64_t from = 0;
    const auto first = std::from_chars(field.data() + kUnit.size(), end, from);
    if (first.ec != std::errc() || first.ptr == end || *first.ptr != '-') return {};
    if (first.ptr + 1 == end) return {from, kMostBytes};
    std::uint64_t last = 0;
    const auto second = std::from_chars(first.ptr + 1, end, last);
    if (second.ec != std::errc() || second.ptr != end || last < from) return {};
    return {from,
            static_cast<std::size_t>(std::min<std::uint64_t>(last - from, kMostBytes - 1) + 1)};
}

bool names(const OrderRecord& record, const std::string& sum) {
    const auto numbered = partsOf(record.bytes);
    if (!numbered) return false;
    try {
        const std::vector<OrderFile> files = readOrder(numbered->carried).order.files;
        return std::any_of(files.begin(), files.end(),
                           [&](const OrderFile& file) { return file.sha256 == sum; });
    } catch (const MessageError&) {
        return false;  // an older centre may have taken what this one would not
    }
}

/// Whether the host has an order that needs the file. No one gets files that were meant for others.
bool mayFetch(ApiServices& services, const std::string& host, const std::string& sum) {
    const std::string fetching = host + ' ' + sum;
    if (services.fetches.isKnown(fetching, wallClock())) return true;
    const bool may = services.ask([host, sum](CentreDesk& desk) {
        const auto open = desk.parts.store.open(host, 1, kHighestNumber, kMostOpen);
        return std::any_of(open.begin(), open.end(), [&](const OpenOrder& order) {
            const auto record = desk.parts.store.order(host, order.order);
            return record && names(*record, sum);
        });
    });
    if (may) services.fetches.note(fetching, wallClock());
    return may;
}

}  // namespace

http::Answer getFileContent(Visit& visit, const Call& call) {
    ApiServices& services = visit.services;
    const std::string& sum = call.required("sha256");
    const auto key = sessionKey(services, call);
    const std::string host = key ? services.hostSigningWith(*key) : "";
    if (host.empty()) return http::errorReply(401, "this needs the session of a host");
    if (!mayFetch(services, host, sum))
        throw Forbidden("no open order of this host needs the file");
    const auto file = services.files.find(sum, 0);
    if (!file || !services.files.has(sum)) throw NothingThere("the file is not here");
    const Range range = rangeIn(call.range());
    if (range.from >= file->size && file->size > 0) {
        http::Reply reply = http::errorReply(416, "the file ends before that");
        reply.fields.emplace_back("Content-Range", "bytes */" + std::to_string(file->size));
        return reply;
    }
    std::string bytes = services.files.read(sum, range.from, range.most).value_or("");
    services.counts.servedPieces.add();
    services.counts.servedBytes.add(bytes.size());
    if (bytes.empty()) return http::Reply{200, "", "application/octet-stream"};
    const std::string last = std::to_string(range.from + bytes.size() - 1);
    http::Reply reply{206, std::move(bytes), "application/octet-stream"};
    reply.fields.emplace_back("Content-Range", "bytes " + std::to_string(range.from) + '-' + last +
                                                   '/' + std::to_string(file->size));
    return reply;
}

}  // namespace fleet
