#include "fleet/link/program/bus_side.h"

#include <charconv>
#include <nlohmann/json.hpp>
#include <optional>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/hello_bytes.h"
#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/link/facts/published_facts.h"
#include "fleet/log/log.h"

using nlohmann::json;

namespace fleet {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

/// For each request. A server that is there answers in milliseconds, a centre with many hosts in a
/// second or two.
constexpr seconds kAnswerTime{5};
/// After the bus has refused this host.
constexpr seconds kRefusedPause{30};
/// The bus takes 256 KiB a message, its headers included.
constexpr std::size_t kMostOutcome = std::size_t{255} * 1024;

/// The number at the end of "rp.task.HOST.NUMBER".
std::optional<Number> numberOf(const std::string& subject) {
    const std::size_t dot = subject.rfind('.');
    if (dot == std::string::npos) return std::nullopt;
    const char* const end = subject.data() + subject.size();
    Number number = 0;
    const auto read = std::from_chars(subject.data() + dot + 1, end, number);
    if (read.ec != std::errc() || read.ptr != end) return std::nullopt;
    return number;
}

}  // namespace

std::string publishedOutcome(const Outcome& outcome, const KeyPair& signing) {
    std::string bytes = signOutcome(outcome, signing);
    if (bytes.size() <= kMostOutcome) return bytes;
    Outcome shorter = outcome;
    try {
        json task = readDocument(outcome.task);
        for (json& command : task.at("details").at("commands")) {
            command.erase("stdout");
            command.erase("stderr");
        }
        shorter.task = textOf(task);
        bytes = signOutcome(shorter, signing);
        if (bytes.size() <= kMostOutcome) return bytes;
        shorter.task = textOf({{"id", task.at("id")}});
    } catch (const std::exception&) {
        shorter.task.clear();
    }
    return signOutcome(shorter, signing);
}

BusSide::BusSide(ConnectionOptions options, Trust trust, const KeyPair& bus, const KeyPair& signing,
                 Events events)
    : options_(std::move(options)),
      trust_(std::move(trust)),
      bus_(bus),
      signing_(signing),
      events_(std::move(events)) {
    options_.events.disconnected = events_.disconnected;
    options_.events.reconnected = events_.connected;
    options_.events.error = [](const std::string& what) {
        say(Priority::Warning, "the bus: " + what);
    };
    worker_.add([this] { connect(); });
}

BusSide::~BusSide() {
    isEnding_ = true;
    worker_.await();  // a job may be waiting for an answer of the connection
    published_.reset();
    questions_.reset();
    if (connection_) connection_->close(kAnswerTime);
}

/// A server that refuses the credentials ends the connection for good. That may be a revocation, or
/// a server that has lost its accounts for a while: only the centre's word ends a link.
ConnectionOptions BusSide::optionsOfThis() {
    ConnectionOptions options = options_;
    options.events.closed = [this, attempt = ++attempt_](const std::string& why) {
        if (isEnding_ || attempt != attempt_) return;
        say(Priority::Warning, "the bus refuses this host: " + why);
        events_.disconnected();
        worker_.add([this] {
            disconnect();
            if (worker_.pause(kRefusedPause)) connect();
        });
    };
    return options;
}

void BusSide::disconnect() {
    ++attempt_;
    published_.reset();
    questions_.reset();
    connection_.reset();
}

/// On the worker, where everything else waits for it.
void BusSide::connect() {
    std::string last;
    for (int attempt = 1; !isEnding_; ++attempt) {
        Connection::Result result = Connection::connect(optionsOfThis());
        if (result.connection) {
            connection_ = std::move(result.connection);
            if (subscribe()) return events_.connected();
            disconnect();
            result.text = "the bus does not let this host hear of its orders";
        }
        if (std::exchange(last, result.text) != result.text) {
            say(Priority::Warning, "no connection to the bus: " + result.text);
        }
        if (!worker_.pause(pauseBefore(options_, attempt))) return;
    }
}

bool BusSide::subscribe() {
    Connection::Subscribed made = connection_->subscribe(
        "rp.task." + trust_.host + ".*",
        [this](const BusMessage& message) {
            if (const std::optional<Number> number = numberOf(message.subject)) {
                events_.seen(*number);
            }
        },
        kAnswerTime);
    published_ = std::move(made.subscription);
    return published_ != nullptr && subscribeToQuestions();
}

bool BusSide::subscribeToQuestions() {
    Connection::QueueLimit limit;
    limit.messages = 64;
    limit.bytes = 4 << 20;
    Connection::Subscribed made = connection_->subscribe(
        "rp.ask." + trust_.host, [this](const BusMessage& message) { events_.asked(message.data); },
        kAnswerTime, limit);
    questions_ = std::move(made.subscription);
    return questions_ != nullptr;
}

void BusSide::read(Number number) {
    worker_.add([this, number] { readNow(number); });
}

void BusSide::readNow(Number number) {
    if (!connection_) return events_.unanswered(number);
    const std::string subject = "task." + trust_.host + '.' + std::to_string(number);
    const LastResult found = lastOn(*connection_, kTasksStream, subject, kAnswerTime);
    if (found.kind == LastResult::Kind::Missing) return events_.missing(number);
    if (found.kind != LastResult::Kind::Found) return events_.unanswered(number);
    std::optional<Directive> directive = judge(found.bytes, number, trust_, bus_);
    if (directive) return events_.read(number, std::move(*directive));
    ++unsignedNumbers_;
    say(Priority::Warning,
        "order " + std::to_string(number) + " on the bus is not one that the centre has numbered");
    events_.missing(number);
}

void BusSide::sayHello(Hello hello) {
    worker_.add([this, hello = std::move(hello)] { sayHelloNow(hello); });
}

void BusSide::sayHelloNow(const Hello& hello) {
    if (!connection_) return events_.unheard(hello.nonce);
    const Connection::Reply answer = connection_->request(
        "hello." + trust_.host, signHello(trust_.host, hello, signing_), kAnswerTime);
    if (!answer.status.done()) return events_.unheard(hello.nonce);
    try {
        events_.replied(readReply(answer.message.data, trust_.host, trust_.centres));
    } catch (const MessageError& error) {
        say(Priority::Warning, std::string("a reply that is not the centre's: ") + error.what());
        events_.unheard(hello.nonce);
    }
}

void BusSide::report(const Outcome& outcome) {
    worker_.add([this, outcome] { reportNow(outcome); });
}

void BusSide::reportNow(const Outcome& outcome) {
    if (!connection_) return;
    // Nobody waits for the bus's acknowledgement, which confirms nothing: what is lost is asked for
    // by the next reply.
    static_cast<void>(
        connection_->publish("out." + trust_.host, publishedOutcome(outcome, signing_)));
}

void BusSide::answer(std::vector<std::string> pieces) {
    worker_.add([this, pieces = std::move(pieces)] {
        // Who asks sees what is lost, and asks again.
        for (const std::string& piece : pieces) {
            if (connection_) static_cast<void>(connection_->publish("ans." + trust_.host, piece));
        }
    });
}

void BusSide::tell(Facts facts, std::function<void(bool)> answer) {
    worker_.add(
        [this, facts = std::move(facts), answer = std::move(answer)] { answer(tellNow(facts)); });
}

/// Nobody asks for facts again, so the acknowledgement is waited for.
bool BusSide::tellNow(const Facts& facts) {
    if (!connection_) return false;
    const StoreResult result = store(*connection_, kFactsSubject + trust_.host,
                                     publishedFacts(facts, signing_), kAnswerTime);
    if (result.kind == StoreResult::Kind::Stored) return true;
    say(Priority::Warning, "the bus does not keep this host's facts: " + result.text);
    return false;
}

}  // namespace fleet
