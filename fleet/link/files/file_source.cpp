#include "fleet/link/files/file_source.h"

#include <chrono>
#include <nlohmann/json.hpp>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/session.h"

namespace fleet {
namespace {

/// A link that ends waits so long for an answer at most.
constexpr std::chrono::seconds kAnswerTime{15};
constexpr unsigned kWhole = 200;
constexpr unsigned kPiece = 206;
constexpr unsigned kNoSession = 401;

HttpsClient::Deadline deadline() {
    return std::chrono::steady_clock::now() + kAnswerTime;
}

std::string wordsOf(const HttpsAnswer& answer) {
    try {
        return textIn(readDocument(answer.body), "error");
    } catch (const MessageError&) {
        return "the centre answers with status " + std::to_string(answer.status);
    }
}

}  // namespace

FileSource::FileSource(FileSourceSettings settings, std::function<bool()> isWanted)
    : settings_(std::move(settings)), isWanted_(std::move(isWanted)) {}

void FileSource::fetch(const OrderFile& file, Spool& spool) {
    if (spool.has(file.sha256)) return;
    std::uint64_t have = spool.partOf(file.sha256);
    if (have > file.size) {
        spool.forget(file.sha256);
        have = 0;
    }
    while (have < file.size) {
        if (!isWanted_()) throw NotFetched("something else comes first");
        if (!spool.hasRoomFor(file.size - have)) {
            throw NotFetched(file.path + " does not fit on this disk, which must not become full");
        }
        const HttpsAnswer answer = piece(file.sha256, have);
        if (answer.status != kPiece || answer.body.empty() ||
            answer.body.size() > file.size - have) {
            throw NotFetched(file.path + " does not come: " + wordsOf(answer));
        }
        spool.append(file.sha256, answer.body);
        have += answer.body.size();
    }
    // Who signed the order has signed the sum; what the centre sends must have it.
    if (!spool.complete(file.sha256)) {
        throw NotFetched(file.path + ": what the centre sends has another SHA-256");
    }
}

HttpsAnswer FileSource::piece(const std::string& sum, std::uint64_t from) {
    if (settings_.url.empty()) {
        throw NotFetched("the link's configuration does not say where the centre is: \"url\"");
    }
    try {
        if (!client_) {
            client_ = std::make_unique<HttpsClient>(readServerUrl(settings_.url),
                                                    ServerTrust::byAuthority(settings_.authority));
        }
        HttpsAnswer answer = ask(sum, from);
        if (answer.status != kNoSession) return answer;
        openSession();
        return ask(sum, from);
    } catch (const HttpsError& error) {
        throw NotFetched(error.what());
    } catch (const UrlError& error) {
        throw NotFetched(error.what());
    }
}

HttpsAnswer FileSource::ask(const std::string& sum, std::uint64_t from) {
    HttpsRequest request{"GET", "/v1/files/" + sum + "/content"};
    request.session = session_;
    request.range = "bytes=" + std::to_string(from) + "-";
    return client_->ask(request, deadline());
}

void FileSource::openSession() {
    SessionRequest request;
    request.fleet = settings_.fleet;
    request.key = settings_.signing.publicKey();
    request.url = settings_.url;
    request.time = wallClock();
    request.nonce = makeSessionNonce();
    HttpsRequest post{"POST", "/v1/sessions", signSessionRequest(request, settings_.signing)};
    post.contentType = "application/octet-stream";
    const HttpsAnswer answer = client_->ask(post, deadline());
    if (answer.status != kWhole) throw NotFetched(wordsOf(answer));
    try {
        session_ = textIn(readDocument(answer.body), "session");
    } catch (const MessageError& error) {
        throw NotFetched(std::string("the centre's answer is none: ") + error.what());
    }
}

}  // namespace fleet
