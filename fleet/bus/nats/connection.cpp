#include "fleet/bus/nats/connection.h"

#include <sodium.h>

#include <algorithm>
#include <array>
#include <condition_variable>
#include <mutex>
#include <stdexcept>
#include <utility>

#include "fleet/bus/nats/client.h"
#include "fleet/bus/nats/client_options.h"
#include "fleet/bus/nats/delivery.h"
#include "fleet/bus/nats/subject.h"
#include "fleet/bus/nats/waiting.h"

namespace fleet {

namespace {

constexpr int kAttemptsWithOtherNonces = 5;
/// How long the library's thread may take to tell of an error that it has read.
constexpr std::chrono::seconds kErrorsAreTold(5);

using Clock = std::chrono::steady_clock;

std::int64_t leftUntil(Clock::time_point deadline) {
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
    return std::max<std::int64_t>(left.count(), 1);
}

std::string randomToken() {
    std::array<unsigned char, 12> bytes{};
    randombytes_buf(bytes.data(), bytes.size());
    std::array<char, 2 * bytes.size() + 1> text{};
    sodium_bin2hex(text.data(), text.size(), bytes.data(), bytes.size());
    return text.data();
}

/// What the server does not permit, by its words: Permissions Violation for Publish to "SUBJECT".
struct Violation {
    bool ofPublish = false;
    std::string subject;
};

Violation violationOf(const std::string& text) {
    Violation violation;
    violation.ofPublish = text.find("for Publish to") != std::string::npos;
    const std::size_t begin = text.find('"');
    const std::size_t end = text.find('"', begin + 1);
    if (begin != std::string::npos && end != std::string::npos) {
        violation.subject = text.substr(begin + 1, end - begin - 1);
    }
    return violation;
}

Connection::Result::Failure failureOf(natsStatus result) {
    using Failure = Connection::Result::Failure;
    switch (result) {
        case NATS_CONNECTION_AUTH_FAILED:
            return Failure::Refused;
        case NATS_SSL_ERROR:
        case NATS_SECURE_CONNECTION_WANTED:
        case NATS_SECURE_CONNECTION_REQUIRED:
            return Failure::NotTrusted;
        case NATS_INVALID_ARG:
        case NATS_ADDRESS_MISSING:
            return Failure::Misconfigured;
        default:
            return Failure::Unreachable;
    }
}

std::string lastErrorOf(natsConnection* connection) {
    const char* text = nullptr;
    natsConnection_GetLastError(connection, &text);
    return text == nullptr ? "" : text;
}

/// The text of the error that a callback is called for. The connection's last one may be of a later
/// error.
std::string errorOfCallback(natsConnection* connection, natsStatus error) {
    natsStatus status = NATS_OK;
    const char* text = nats_GetLastError(&status);
    return text == nullptr || status != error ? lastErrorOf(connection) : text;
}

}  // namespace

// ---- Subscription
// ---------------------------------------------------------------------------------

class Subscription::Impl {
public:
    Impl(std::shared_ptr<Connection::Impl> connection, std::shared_ptr<Delivery> delivery,
         natsSubscription* subscription)
        : connection_(std::move(connection)),
          delivery_(std::move(delivery)),
          subscription_(subscription) {}
    ~Impl() {
        natsSubscription_Unsubscribe(subscription_);
        delivery_->stop();
        natsSubscription_Destroy(subscription_);
    }
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    std::uint64_t dropped() const {
        std::int64_t count = 0;
        natsSubscription_GetDropped(subscription_, &count);
        return static_cast<std::uint64_t>(count);
    }

private:
    const std::shared_ptr<Connection::Impl> connection_;
    const std::shared_ptr<Delivery> delivery_;
    natsSubscription* const subscription_;
};

Subscription::Subscription(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}
Subscription::~Subscription() = default;

std::uint64_t Subscription::dropped() const {
    return impl_->dropped();
}

// ---- Connection
// -----------------------------------------------------------------------------------

class Connection::Impl {
public:
    explicit Impl(const ConnectionOptions& options)
        : identity_(options), inbox_(options.inboxPrefix + "." + randomToken()) {}
    ~Impl();
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;

    Result::Failure connect(std::string& why);
    bool connected() const {
        return natsConnection_Status(connection_) == NATS_CONN_STATUS_CONNECTED;
    }
    const Identity& identity() const { return identity_; }

    BusStatus publish(const std::string& subject, const std::string& reply, std::string_view bytes,
                      const BusHeaders& headers);
    /// Publishes a request; its number is for await().
    BusStatus ask(const Request& request, std::uint64_t& number);
    BusStatus await(const Request& request, std::uint64_t number, Clock::time_point deadline,
                    BusMessage& answer);
    BusStatus listen(const std::string& subject, std::shared_ptr<Delivery> delivery,
                     QueueLimit limit, natsSubscription** subscription);
    BusStatus checkPermitted(const std::string& subject, std::uint64_t violationsBefore);
    std::uint64_t violations() const;
    BusStatus flush(Clock::time_point deadline);
    BusStatus close(Clock::time_point deadline);

private:
    static void onDisconnected(natsConnection*, void* self);
    static void onReconnected(natsConnection*, void* self);
    static void onClosed(natsConnection* connection, void* self);
    static void onError(natsConnection* connection, natsSubscription*, natsStatus error,
                        void* self);

    const ConnectionEvents& events() const { return identity_.options().events; }
    natsStatus setEvents(natsOptions* options);
    void countViolation(const std::string& text);
    BusStatus listenForAnswers();
    void takeAnswer(const BusMessage& message);
    void shut();

    Identity identity_;
    const std::string inbox_;
    natsConnection* connection_ = nullptr;
    Waiting waiting_;

    std::mutex inboxMutex_;
    natsSubscription* inboxSubscription_ = nullptr;
    std::shared_ptr<Delivery> inboxDelivery_;

    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    bool over_ = false;  ///< the last event has been told
    std::uint64_t violations_ = 0;
};

Connection::Impl::~Impl() {
    if (connection_ == nullptr) return;
    shut();
    if (inboxDelivery_) inboxDelivery_->stop();
    natsSubscription_Destroy(inboxSubscription_);
    natsConnection_Destroy(connection_);
}

natsStatus Connection::Impl::setEvents(natsOptions* options) {
    natsStatus result = natsOptions_SetDisconnectedCB(options, &Impl::onDisconnected, this);
    if (result == NATS_OK) {
        result = natsOptions_SetReconnectedCB(options, &Impl::onReconnected, this);
    }
    if (result == NATS_OK) result = natsOptions_SetClosedCB(options, &Impl::onClosed, this);
    if (result == NATS_OK) result = natsOptions_SetErrorHandler(options, &Impl::onError, this);
    return result;
}

Connection::Result::Failure Connection::Impl::connect(std::string& why) {
    for (int attempt = 1;; ++attempt) {
        const NatsOptions options = identity_.makeOptions(why);
        if (!options || setEvents(options.get()) != NATS_OK) return Result::Failure::Misconfigured;
        const std::uint64_t unsendable = identity_.unsendableSignatures();
        const natsStatus result = natsConnection_Connect(&connection_, options.get());
        if (result == NATS_OK) return Result::Failure::None;
        const char* more = nats_GetLastError(nullptr);
        why = std::string(natsStatus_GetText(result)) +
              (more == nullptr || *more == '\0' ? "" : ": " + std::string(more));
        if (identity_.unsendableSignatures() == unsendable || attempt == kAttemptsWithOtherNonces) {
            return failureOf(result);
        }
    }
}

BusStatus Connection::Impl::publish(const std::string& subject, const std::string& reply,
                                    std::string_view bytes, const BusHeaders& headers) {
    BusStatus status;
    const NatsMessage message = makeMessage(subject, reply, bytes, headers, status);
    if (!message) return status;
    if (identity_.options().reconnectBuffer == 0 && !connected()) {
        return BusStatus::noAnswer("no connection to the bus");
    }
    return statusOf(natsConnection_PublishMsg(connection_, message.get()), "not published");
}

BusStatus Connection::Impl::ask(const Request& request, std::uint64_t& number) {
    if (!connected()) return BusStatus::noAnswer("no connection to the bus");
    BusStatus status = listenForAnswers();
    if (!status.done()) return status;
    number = waiting_.begin(request.subject);
    status = publish(request.subject, inbox_ + "." + std::to_string(number), request.bytes,
                     request.headers);
    if (!status.done()) waiting_.drop(number);
    return status;
}

BusStatus Connection::Impl::await(const Request& request, std::uint64_t number,
                                  Clock::time_point deadline, BusMessage& answer) {
    BusStatus status = waiting_.await(number, deadline, answer);
    const std::string* code = answer.header("Status");
    if (status.done() && code != nullptr && *code == "503") {
        return BusStatus::noAnswer("nobody listens on " + request.subject);
    }
    return status;
}

BusStatus Connection::Impl::listenForAnswers() {
    const std::lock_guard lock(inboxMutex_);
    if (inboxSubscription_ != nullptr) return {};
    inboxDelivery_ =
        std::make_shared<Delivery>([this](const BusMessage& message) { takeAnswer(message); });
    return listen(inbox_ + ".*", inboxDelivery_, {}, &inboxSubscription_);
}

void Connection::Impl::takeAnswer(const BusMessage& message) {
    const std::string token = message.subject.substr(message.subject.rfind('.') + 1);
    // Only a number of ours is worth anything; others may publish here.
    if (token.empty() || token.size() > 18 ||
        token.find_first_not_of("0123456789") != std::string::npos) {
        return;
    }
    waiting_.answer(std::stoull(token), message);
}

BusStatus Connection::Impl::listen(const std::string& subject, std::shared_ptr<Delivery> delivery,
                                   QueueLimit limit, natsSubscription** subscription) {
    auto held = std::make_unique<std::shared_ptr<Delivery>>(std::move(delivery));
    natsStatus result = natsConnection_Subscribe(subscription, connection_, subject.c_str(),
                                                 &Delivery::onMessage, held.get());
    if (result != NATS_OK) return statusOf(result, "not subscribed");
    result = natsSubscription_SetOnCompleteCB(*subscription, &Delivery::onComplete, held.get());
    // The library may still call it: then it stays, for want of somebody who says when it is over.
    static_cast<void>(held.release());
    if (result == NATS_OK) {
        result = natsSubscription_SetPendingLimits(*subscription, limit.messages, limit.bytes);
    }
    if (result == NATS_OK) return {};
    natsSubscription_Unsubscribe(*subscription);
    natsSubscription_Destroy(std::exchange(*subscription, nullptr));
    return statusOf(result, "not subscribed");
}

std::uint64_t Connection::Impl::violations() const {
    const std::lock_guard lock(mutex_);
    return violations_;
}

BusStatus Connection::Impl::checkPermitted(const std::string& subject,
                                           std::uint64_t violationsBefore) {
    const std::string text = lastErrorOf(connection_);
    const Violation violation = violationOf(text);
    if (violation.ofPublish || violation.subject != subject) return {};
    // The library keeps its last error. Only one that is told after this has begun is meant.
    std::unique_lock lock(mutex_);
    const bool isNew = changed_.wait_for(lock, kErrorsAreTold,
                                         [&] { return over_ || violations_ > violationsBefore; });
    return isNew ? BusStatus::forbidden(text) : BusStatus{};
}

BusStatus Connection::Impl::flush(Clock::time_point deadline) {
    return statusOf(natsConnection_FlushTimeout(connection_, leftUntil(deadline)),
                    "the bus has not confirmed");
}

BusStatus Connection::Impl::close(Clock::time_point deadline) {
    const BusStatus status = flush(deadline);
    shut();
    return status;
}

void Connection::Impl::shut() {
    natsConnection_Close(connection_);
    waiting_.failAll(BusStatus::noAnswer("the connection is closed"));
    std::unique_lock lock(mutex_);
    changed_.wait(lock, [this] { return over_; });
}

void Connection::Impl::onDisconnected(natsConnection*, void* self) {
    auto* impl = static_cast<Impl*>(self);
    impl->waiting_.failAll(BusStatus::noAnswer("the connection to the bus broke"));
    // The library subscribes again on the next connection, whose rights may be others.
    impl->waiting_.answersComeAgain();
    if (impl->events().disconnected) impl->events().disconnected();
}

void Connection::Impl::onReconnected(natsConnection*, void* self) {
    auto* impl = static_cast<Impl*>(self);
    if (impl->events().reconnected) impl->events().reconnected();
}

void Connection::Impl::onClosed(natsConnection* connection, void* self) {
    auto* impl = static_cast<Impl*>(self);
    impl->waiting_.failAll(BusStatus::noAnswer("the connection is closed"));
    if (impl->events().closed) impl->events().closed(lastErrorOf(connection));
    const std::lock_guard lock(impl->mutex_);
    impl->over_ = true;
    impl->changed_.notify_all();
}

void Connection::Impl::onError(natsConnection* connection, natsSubscription*, natsStatus error,
                               void* self) {
    auto* impl = static_cast<Impl*>(self);
    const std::string text = errorOfCallback(connection, error);
    if (error == NATS_NOT_PERMITTED) impl->countViolation(text);
    if (!impl->events().error) return;
    impl->events().error(error == NATS_SLOW_CONSUMER || text.empty() ? natsStatus_GetText(error)
                                                                     : text);
}

void Connection::Impl::countViolation(const std::string& text) {
    const Violation violation = violationOf(text);
    if (violation.ofPublish) {
        waiting_.fail(violation.subject, BusStatus::forbidden(text));
    } else if (violation.subject == inbox_ + ".*") {
        // The server says this once, maybe before the first request has begun.
        waiting_.answersDoNotCome(BusStatus::forbidden(text));
    }
    const std::lock_guard lock(mutex_);
    ++violations_;
    changed_.notify_all();
}

// ---- What others see
// ------------------------------------------------------------------------------

Connection::Result Connection::connect(const ConnectionOptions& options) {
    Result result;
    if (sodium_init() < 0) throw std::runtime_error("libsodium cannot be used");
    if (!isSubject(options.inboxPrefix)) {
        result.failure = Result::Failure::Misconfigured;
        result.text = "the prefix of the inboxes is no subject";
        return result;
    }
    auto impl = std::make_shared<Impl>(options);
    result.failure = impl->connect(result.text);
    if (result.failure == Result::Failure::None) {
        result.connection.reset(new Connection(std::move(impl)));
        result.text.clear();
    }
    return result;
}

Connection::Connection(std::shared_ptr<Impl> impl) : impl_(std::move(impl)) {}
Connection::~Connection() = default;

bool Connection::connected() const {
    return impl_->connected();
}

std::uint64_t Connection::failedReconnects() const {
    return impl_->identity().failedReconnects();
}

std::uint64_t Connection::unsendableSignatures() const {
    return impl_->identity().unsendableSignatures();
}

BusStatus Connection::publish(const std::string& subject, std::string_view bytes,
                              const BusHeaders& headers) {
    return impl_->publish(subject, "", bytes, headers);
}

BusStatus Connection::publishAsking(const std::string& subject, const std::string& reply,
                                    std::string_view bytes) {
    return impl_->publish(subject, reply, bytes, {});
}

std::string Connection::newInbox() const {
    return impl_->identity().options().inboxPrefix + "." + randomToken();
}

Connection::Reply Connection::request(const std::string& subject, std::string_view bytes,
                                      Milliseconds deadline, const BusHeaders& headers) {
    return std::move(requestAll({{subject, bytes, headers}}, deadline).front());
}

std::vector<Connection::Reply> Connection::requestAll(const std::vector<Request>& requests,
                                                      Milliseconds deadline) {
    const auto end = Clock::now() + deadline;
    std::vector<Reply> replies(requests.size());
    std::vector<std::uint64_t> numbers(requests.size());
    for (std::size_t i = 0; i < requests.size(); ++i)
        replies[i].status = impl_->ask(requests[i], numbers[i]);
    for (std::size_t i = 0; i < requests.size(); ++i) {
        Reply& reply = replies[i];
        if (!reply.status.done()) continue;
        reply.status = impl_->await(requests[i], numbers[i], end, reply.message);
    }
    return replies;
}

Connection::Subscribed Connection::subscribe(const std::string& subject, Receiver receiver,
                                             Milliseconds deadline) {
    return subscribe(subject, std::move(receiver), deadline, QueueLimit());
}

Connection::Subscribed Connection::subscribe(const std::string& subject, Receiver receiver,
                                             Milliseconds deadline, QueueLimit limit) {
    Subscribed subscribed;
    if (!isSubjectPattern(subject)) {
        subscribed.status = BusStatus::refused(0, "nothing can be subscribed to by that subject");
        return subscribed;
    }
    const auto end = Clock::now() + deadline;
    const std::uint64_t violations = impl_->violations();
    auto delivery = std::make_shared<Delivery>(std::move(receiver));
    natsSubscription* made = nullptr;
    subscribed.status = impl_->listen(subject, delivery, limit, &made);
    if (!subscribed.status.done()) return subscribed;
    auto subscription = std::make_unique<Subscription::Impl>(impl_, std::move(delivery), made);
    subscribed.status = impl_->flush(end);
    if (subscribed.status.done()) {
        subscribed.status = impl_->checkPermitted(subject, violations);
    }
    if (subscribed.status.done()) {
        subscribed.subscription.reset(new Subscription(std::move(subscription)));
    }
    return subscribed;
}

BusStatus Connection::flush(Milliseconds deadline) {
    return impl_->flush(Clock::now() + deadline);
}

BusStatus Connection::close(Milliseconds deadline) {
    return impl_->close(Clock::now() + deadline);
}

}  // namespace fleet
