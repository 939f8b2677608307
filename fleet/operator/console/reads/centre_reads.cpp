#include "fleet/operator/console/reads/centre_reads.h"

#include <string_view>
#include <utility>
#include <variant>

#include "ctl/client/failure.h"
#include "ctl/console/refusals.h"
#include "ctl/console/request_check.h"
#include "fleet/operator/centre/answers.h"

namespace fleet {
namespace {

/// A browser asks no more at a time of one server, and the answers are held as a whole.
constexpr std::size_t kMostClients = 6;
constexpr std::size_t kMostDigits = 6;
constexpr std::string_view kEvents = "/v1/events";
/// Four times what the centre lets pass between two signs of life.
constexpr std::chrono::seconds kLongestSilence{60};

/// A browser would take the one for half an answer and the other for the console's own.
http::Reply replyOf(HttpsAnswer answer, const console::AnswerRoom& room) {
    if (answer.status < 200 || answer.status == kSessionOver) {
        return http::errorReply(502, "the centre answers with the status " +
                                         std::to_string(answer.status) + ", which makes no sense");
    }
    const auto share = room.share();
    if (!share->grow(answer.body.size())) return console::noRoomForAnswer();
    http::Reply reply{answer.status, std::move(answer.body)};
    reply.held = share;
    const std::string& pause = answer.retryAfter;
    const bool isPause = !pause.empty() && pause.size() <= kMostDigits &&
                         pause.find_first_not_of("0123456789") == std::string::npos;
    if (isPause) reply.fields.emplace_back("Retry-After", pause);
    return reply;
}

}  // namespace

/// A client for one question at a time, which goes back to the others. There are so many and no
/// more: answers that are long, all at once, take limited memory. Throws HttpsError(TooLate) if the
/// deadline comes before its turn.
class CentreReads::LentClient {
public:
    LentClient(CentreReads& reads, HttpsClient::Deadline deadline) : reads_(reads) {
        std::unique_lock lock(reads_.mutex_);
        const bool isThere =
            reads_.returned_.wait_until(lock, deadline, [this] { return !reads_.idle_.empty(); });
        if (!isThere) {
            throw HttpsError(HttpsError::Kind::TooLate,
                             "the centre has not answered what was asked before");
        }
        client_ = std::move(reads_.idle_.back());
        reads_.idle_.pop_back();
    }
    ~LentClient() {
        const std::lock_guard lock(reads_.mutex_);
        reads_.idle_.push_back(std::move(client_));
        reads_.returned_.notify_one();
    }
    LentClient(const LentClient&) = delete;
    LentClient& operator=(const LentClient&) = delete;

    HttpsClient& operator*() const { return *client_; }

private:
    CentreReads& reads_;
    std::unique_ptr<HttpsClient> client_;
};

CentreReads::CentreReads(const OperatorIdentity& identity, CentreSession& session,
                         std::chrono::milliseconds time)
    : identity_(identity), session_(session), time_(time) {
    idle_.reserve(kMostClients);
    while (idle_.size() < kMostClients)
        idle_.push_back(centreClient(identity_));
}

CentreReads::~CentreReads() = default;

http::Answer CentreReads::answer(const http::Request& request) {
    try {
        if (console::pathOf(request) == kEvents) return events(request);
        return replyOf(get(request.target), room_);
    } catch (const HttpsError& error) {
        return console::replyTo(centreFailure(error));
    } catch (const ctl::Failure& failure) {
        return console::replyTo(failure);
    }
}

HttpsAnswer CentreReads::get(const std::string& target) {
    const HttpsClient::Deadline deadline = std::chrono::steady_clock::now() + time_;
    const LentClient client(*this, deadline);
    return session_.ask(*client, {"GET", target}, deadline, [&](const HttpsRequest& request) {
        return (*client).ask(request, deadline);
    });
}

http::Answer CentreReads::events(const http::Request& request) {
    if (request.method == "HEAD") return http::Reply{200, "", "text/event-stream"};
    HttpsRequest wanted{"GET", request.target};
    wanted.lastEventId = request.lastEventId;
    const HttpsClient::Deadline deadline = std::chrono::steady_clock::now() + time_;
    auto opened = streams_.open(
        centreClient(identity_),
        [this, wanted, deadline](HttpsClient& client, const auto& take, const auto& onBegin) {
            return session_.ask(client, wanted, deadline, [&](const HttpsRequest& asked) {
                return client.read(asked, deadline, kLongestSilence, take, onBegin);
            });
        });
    if (auto* const answer = std::get_if<HttpsAnswer>(&opened))
        return replyOf(std::move(*answer), room_);
    return std::get<std::unique_ptr<http::EventSource>>(std::move(opened));
}

}  // namespace fleet
