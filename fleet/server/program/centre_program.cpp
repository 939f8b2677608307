#include "fleet/server/program/centre_program.h"

#include <algorithm>
#include <exception>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/facts.h"
#include "fleet/bus/messages/hello_bytes.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/log/log.h"
#include "fleet/server/program/counted_transaction.h"
#include "fleet/server/store/host_facts.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using Steady = std::chrono::steady_clock;

/// The bus writes to its disk before it answers, which may be as busy as the rest of its machine.
constexpr seconds kStreamAnswerTime{10};
constexpr seconds kFarewellTime{5};
constexpr seconds kPause{1};
/// A bus that is not away but whose store is, for as long, has lost its account.
constexpr seconds kStoreAway{10};
/// Letters that share one transaction, and orders that are published between two looks at them.
constexpr std::size_t kMostAtOnce = 256;
/// Hellos that wait; those beyond are said again.
constexpr int kMostHellos = 20'000;
/// What a number adds to an order, at most.
constexpr std::size_t kNumberBytes = 4096;
constexpr char kHelloSubject[] = "hello.";
constexpr char kAnswerSubject[] = "ans.";
constexpr char kAskSubject[] = "rp.ask.";
constexpr char kTaskSubjects[] = "task.>";
constexpr char kLeaseSubject[] = "$KV.CENTRE.lease";

/// Host and number in "task.HOST.NUMBER"; nothing if it is no such subject.
std::optional<std::pair<std::string, Number>> placeOf(const std::string& subject) {
    const std::size_t first = subject.find('.');
    const std::size_t last = subject.rfind('.');
    if (first == std::string::npos || first == last) return std::nullopt;
    const std::string host = subject.substr(first + 1, last - first - 1);
    const std::string digits = subject.substr(last + 1);
    constexpr std::size_t kMostDigits = 16;
    if (digits.empty() || digits.size() > kMostDigits ||
        digits.find_first_not_of("0123456789") != std::string::npos) {
        return std::nullopt;
    }
    return std::pair{host, std::stoull(digits)};
}

}  // namespace

CentreProgram::CentreProgram(CentreSettings settings)
    : settings_(std::move(settings)),
      database_(settings_.directory),
      store_(database_.connection()),
      leaseTerm_(settings_.leaseTerm) {}

CentreProgram::~CentreProgram() = default;

void CentreProgram::end() {
    isEnding_ = true;
    mailbox_.put([this] {
        if (!end_) end_ = End::Asked;
    });
}

CentreProgram::End CentreProgram::run() {
    bool hasFailed = false;
    try {
        connect();
        if (!isEnding_ && claim()) {
            hasFailed = !beginWork();
            if (!hasFailed) loop();
        }
    } catch (...) {
        finish();
        throw;
    }
    finish();
    return end_.value_or(isBusLost_ || hasFailed ? End::LeaseLost : End::Asked);
}

void CentreProgram::finish() {
    isEnding_ = true;
    isWorking_ = false;
    // Who waits for an answer to a letter is told that none comes.
    mailbox_.close();
    afterCommit_.clear();
    // Each of them uses what stands before it.
    if (sweeper_) sweeper_->await();
    if (renewer_) renewer_->await();
    questions_.close();
    hellos_.reset();
    answers_.reset();
    outcomes_.reset();
    facts_.reset();
    if (lease_ && end_ != End::LeaseLost) lease_->release();
    if (connection_) connection_->close(kFarewellTime);
}

void CentreProgram::connect() {
    std::string last;
    ConnectionOptions options = settings_.bus;
    options.events.error = [](const std::string& what) {
        say(Priority::Warning, "the bus: " + what);
    };
    options.events.disconnected = [this] { isConnected_ = false; };
    options.events.reconnected = [this] { isConnected_ = true; };
    options.events.closed = [this](const std::string& why) {
        isConnected_ = false;
        if (isEnding_ || isReaching_ || isBusLost_.exchange(true)) return;
        say(Priority::Error, "the bus refuses this centre: " + why);
        mailbox_.put([this] {
            if (!end_) end_ = End::LeaseLost;
        });
    };
    while (!isEnding_) {
        // Events of the new connection may come before it is told to be there.
        isConnected_ = true;
        Connection::Result result = Connection::connect(options);
        if (result.connection) {
            connection_ = std::move(result.connection);
            return;
        }
        isConnected_ = false;
        if (std::exchange(last, result.text) != result.text) {
            say(Priority::Warning, "no connection to the bus: " + result.text);
        }
        std::this_thread::sleep_for(milliseconds(500));
    }
}

bool CentreProgram::ensureStreams() {
    for (const StreamSettings& stream :
         {tasksStream(settings_.limits), outStream(settings_.limits), hostsStream(settings_.limits),
          centreStream(settings_.limits)}) {
        const EnsureResult ensured = ensureStream(*connection_, stream, kStreamAnswerTime);
        if (!ensured.status.done()) {
            say(Priority::Warning, "stream " + stream.name + ": " + ensured.status.text);
            return false;
        }
        if (ensured.made) say(Priority::Notice, "made the stream " + stream.name);
        for (const std::string& difference : ensured.differences)
            say(Priority::Warning, "stream " + stream.name + ": " + difference);
    }
    return true;
}

/// A server may take an account apart while the centre's connection comes: its store never answers
/// that connection then, nor those that come later, until the account is told anew.
void CentreProgram::reachAnew() {
    say(Priority::Warning, "the bus's store does not answer; connecting anew");
    isReaching_ = true;
    lease_.reset();
    connection_->close(kFarewellTime);
    connection_.reset();
    isReaching_ = false;
    if (settings_.storeAway) settings_.storeAway();
    connect();
}

void CentreProgram::prepareLease() {
    lease_ = std::make_unique<Lease>(*connection_,
                                     Lease::Settings{kCentreStream, kLeaseSubject, settings_.holder,
                                                     settings_.leaseTerm, leaseTerm_.deadline()});
}

/// Waits until this centre may work. False if it is to end before.
bool CentreProgram::claim() {
    std::string last;
    auto answered = Steady::now();
    prepareLease();
    while (!isEnding_ && !isBusLost_) {
        const auto asked = Steady::now();
        if (asked - answered > kStoreAway && connection_->connected()) {
            reachAnew();
            if (isEnding_) return false;
            prepareLease();
            answered = Steady::now();
            continue;
        }
        if (ensureStreams()) {
            answered = asked;
            const Lease::State state = lease_->claim();
            leaseTerm_.judge(state.kind, asked, Steady::now());
            if (state.kind == Lease::State::Kind::Ours && hasLease()) return true;
            if (std::exchange(last, state.text) != state.text) {
                say(Priority::Notice, "waiting for the lease: " + state.text);
            }
        }
        std::this_thread::sleep_for(std::min<milliseconds>(kPause, settings_.leaseTerm / 3));
    }
    return false;
}

/// On the renewer's thread.
void CentreProgram::renewLease() {
    std::string trouble;
    milliseconds pause = leaseTerm_.pause();
    while (renewer_->pause(pause)) {
        const auto asked = Steady::now();
        const Lease::State state = lease_->renew();
        switch (leaseTerm_.judge(state.kind, asked, Steady::now())) {
            case LeaseTerm::Next::Renew:
                counts_.renewals.add();
                trouble.clear();
                pause = leaseTerm_.pause();
                break;
            case LeaseTerm::Next::Repeat:
                counts_.repeatedRenewals.add();
                if (std::exchange(trouble, state.text) != state.text) {
                    say(Priority::Warning, "the lease is not renewed yet: " + state.text);
                }
                pause = leaseTerm_.pauseOfRepeats();
                break;
            case LeaseTerm::Next::Stop:
                mailbox_.put([this, text = state.text] { loseLease(text); });
                return;
        }
    }
}

void CentreProgram::loseLease(const std::string& why) {
    if (end_) return;
    say(Priority::Error, "the lease is lost: " + why);
    end_ = End::LeaseLost;
}

bool CentreProgram::hasLease() const {
    return leaseTerm_.isOurs(Steady::now());
}

std::optional<milliseconds> CentreProgram::leaseAge() const {
    if (!isWorking_) return std::nullopt;
    return leaseTerm_.age(Steady::now());
}

bool CentreProgram::beginWork() {
    // First: to complete a database that was put back may take longer than the lease lasts.
    renewer_ = std::make_unique<Worker>();
    renewer_->add([this] { renewLease(); });
    bus_ = std::make_unique<NatsCentreBus>(*connection_, [this] { return hasLease(); });
    centre_ = std::make_unique<Centre>(
        store_, *bus_,
        [this](const Alarm& alarm) {
            counts_.alarms.add();
            if (settings_.alarm) settings_.alarm(alarm);
        },
        &counts_);
    if (store_.isPutBack() && !completePutBack()) return false;
    hellos_ = hear(std::string(kHelloSubject) + '*',
                   [this](const BusMessage& message) { takeHello(message); });
    if (!hellos_ || !openQuestions()) return false;
    toldLabels_.setAll(HostFacts(database_.connection()).labels());
    outcomes_ =
        std::make_unique<HostFeed>(*connection_, HostFeed::Source{kOutStream, "out.", "outcomes"},
                                   [this](const auto& told) { return takeOutcomes(told); });
    facts_ = std::make_unique<HostFeed>(*connection_,
                                        HostFeed::Source{kHostsStream, kFactsSubject, "facts"},
                                        [this](const auto& told) { return takeFacts(told); });
    sweeper_ = std::make_unique<Worker>();
    sweeper_->add([this] { sweep(); });
    isWorking_ = true;
    say(Priority::Info, "the centre works");
    return true;
}

/// A bus that is slow, or away for a moment, is asked again as long as the lease lasts; null then.
std::unique_ptr<Subscription> CentreProgram::hear(const std::string& subject,
                                                  const Connection::Receiver& receiver) {
    for (;;) {
        Connection::Subscribed made = connection_->subscribe(subject, receiver, kStreamAnswerTime);
        if (made.subscription) return std::move(made.subscription);
        say(Priority::Warning, subject + " cannot be heard yet: " + made.status.text);
        std::this_thread::sleep_for(kPause);
        if (isEnding_ || isBusLost_ || !hasLease()) return nullptr;
    }
}

bool CentreProgram::openQuestions() {
    answers_ = hear(std::string(kAnswerSubject) + '*', [this](const BusMessage& message) {
        questions_.hear(message.subject.substr(sizeof kAnswerSubject - 1), message.data,
                        wallClock());
    });
    if (!answers_) return false;
    questions_.open([this](const std::string& host, const std::string& bytes) {
        if (hasLease()) static_cast<void>(connection_->publish(kAskSubject + host, bytes));
    });
    return true;
}

/// A copy does not know what was given after it was made. What is still on the bus is adopted, all
/// numbers that may have been given are skipped, and hosts are asked what they have. Before that
/// nobody is answered.
bool CentreProgram::completePutBack() {
    const SubjectsResult found =
        subjectsOf(*connection_, kTasksStream, kTaskSubjects, kStreamAnswerTime);
    if (!found.status.done()) {
        say(Priority::Error, "the orders on the bus cannot be listed: " + found.status.text);
        return false;
    }
    sqlite::Transaction all(database_.connection());
    const Moment at = wallClock();
    // Before the look at the bus: orders of hosts that joined after the copy was made count, too.
    CentreParts parts{*centre_, store_, database_.connection(), news_};
    if (settings_.putBack) settings_.putBack(parts, at);
    const TellFound adopt = [this](const OrderRecord& order) { centre_->adoptFromBus(order); };
    for (const std::string& subject : found.subjects) {
        if (checkOnBus(subject, adopt)) continue;
        say(Priority::Error, "the bus does not say what " + subject + " is");
        return false;
    }
    centre_->restored(at);
    store_.noteCompleted();
    all.commit();
    say(Priority::Notice, "the database was put back; orders on the bus: " +
                              std::to_string(found.subjects.size()) + "; roll-outs are paused");
    return true;
}

void CentreProgram::loop() {
    auto nextWork = Steady::now();
    auto nextLook = nextWork;
    while (!end_) {
        std::optional<Mailbox::Letter> letter = mailbox_.take(nextWork);
        if (letter) {
            readLetters(std::move(*letter));
        } else if (Steady::now() < nextWork) {
            continue;
        }
        // The renewer may wait for an answer meanwhile.
        if (!hasLease()) loseLease("the bus has not renewed it in time");
        if (end_) return;
        const bool isDue = Steady::now() >= nextLook;
        if (isDue) nextLook = Steady::now() + (attend() ? milliseconds(0) : milliseconds(kPause));
        const bool isMore = workOnBus();
        nextWork = isMore ? Steady::now() : nextLook;
    }
}

/// Those that wait already share the transaction. What they let others know is told when it is
/// durable.
void CentreProgram::readLetters(Mailbox::Letter first) {
    CountedTransaction batch(database_.connection(), counts_);
    first();
    for (std::size_t i = 1; i < kMostAtOnce && !end_; ++i) {
        const std::optional<Mailbox::Letter> next = mailbox_.take(Mailbox::Clock::time_point());
        if (!next) break;
        (*next)();
    }
    batch.commit();
    for (const auto& tell : std::exchange(afterCommit_, {}))
        tell();
}

bool CentreProgram::attend() {
    if (!settings_.attend) return false;
    CountedTransaction step(database_.connection(), counts_);
    CentreParts parts{*centre_, store_, database_.connection(), news_};
    const bool isMore = settings_.attend(parts, wallClock());
    step.commit();
    return isMore;
}

/// Notes of what was published share a transaction, too: what is published and not noted is found
/// on the bus when it is published again. Returns whether there is more to do at once.
bool CentreProgram::workOnBus() {
    CountedTransaction batch(database_.connection(), counts_);
    const bool isMore = centre_->work(kMostAtOnce);
    batch.commit();
    return isMore;
}

/// On a thread of the bus.
void CentreProgram::takeHello(const BusMessage& message) {
    const std::string host = message.subject.substr(sizeof kHelloSubject - 1);
    if (message.reply.empty()) return;
    if (!helloLimit_.admits(host, Steady::now()) || waitingHellos_ >= kMostHellos) {
        counts_.unheard.add();
        return;
    }
    ++waitingHellos_;
    mailbox_.put([this, host, reply = message.reply, bytes = message.data] {
        --waitingHellos_;
        answerHello(host, reply, bytes);
    });
}

void CentreProgram::answerHello(const std::string& host, const std::string& reply,
                                const std::string& bytes) {
    const std::optional<HostRecord> record = store_.host(host);
    if (!record) return;
    try {
        const Hello hello = readHello(bytes, host, record->signing);
        std::optional<Reply> answer = centre_->greet(host, hello, wallClock());
        if (!answer) return;
        if (settings_.revoked) answer->revoked = settings_.revoked();
        noteNews(host, hello, wallClock());
        counts_.hellos.add();
        afterCommit_.push_back([this, reply, text = signReply(host, *answer, settings_.key)] {
            if (hasLease()) static_cast<void>(connection_->publish(reply, text));
        });
    } catch (const MessageError& error) {
        say(Priority::Warning, "a hello in the name of " + record->name + ": " + error.what());
    }
}

void CentreProgram::noteNews(const std::string& host, const Hello& hello, Moment at) {
    HostNews& news = news_[host];
    news.heard = at;
    news.taken = hello.taken;
    news.blocked = hello.blocked;
    news.journalNow = hello.journalNow;
    news.skew = hello.time - at;
}

/// On a feed's thread. What is not its host's own counts for nothing, and is done with.
template <typename Take>
bool CentreProgram::takeEach(const std::vector<HostFeed::Told>& told, const char* what, Take take) {
    auto taken = ask([told, what, take](Parts& parts) {
        for (const HostFeed::Told& one : told) {
            const std::optional<HostRecord> record = parts.store.host(one.host);
            if (!record) continue;
            try {
                take(parts, one, *record);
            } catch (const MessageError& error) {
                say(Priority::Warning,
                    std::string(what) + " in the name of " + record->name + ": " + error.what());
            }
        }
        return true;
    });
    try {
        return taken.get();
    } catch (const std::future_error&) {
        return false;  // it ends
    } catch (const std::exception& error) {
        say(Priority::Error, std::string(what) + " not kept: " + error.what());
        return false;
    }
}

bool CentreProgram::takeOutcomes(const std::vector<HostFeed::Told>& told) {
    return takeEach(told, "an outcome",
                    [](Parts& parts, const HostFeed::Told& one, const HostRecord& record) {
                        parts.centre.hear(readOutcome(one.bytes, one.host, record.signing));
                    });
}

bool CentreProgram::takeFacts(const std::vector<HostFeed::Told>& told) {
    return takeEach(
        told, "facts", [this](Parts& parts, const HostFeed::Told& one, const HostRecord& record) {
            Facts facts = readFacts(one.bytes, one.host, record.signing);
            // Older ones are repeated, or from a bus that was put back.
            if (!HostFacts(parts.database).keep(facts, wallClock())) return;
            afterCommit_.push_back(
                [this, host = one.host, labels = facts.labels] { toldLabels_.set(host, labels); });
        });
}

std::future<std::optional<Number>> CentreProgram::submit(std::string orderBytes) {
    return ask([this, bytes = std::move(orderBytes)](Parts& parts) {
        // One that the bus does not take would stand in the way of all others for ever.
        if (bytes.size() > kMostSignedBytes - kNumberBytes) {
            throw MessageError("the order is too long");
        }
        const SignedOrder read = readOrder(bytes);
        const std::string host = read.order.host;
        const std::string order = read.order.id;
        return parts.centre.submit(host, order, [&](Number number) {
            return signNumber(host, number, order, bytes, settings_.key);
        });
    });
}

std::future<std::map<std::string, HostNews>> CentreProgram::news() {
    return ask([this](Parts&) { return news_; });
}

/// On the sweeper's thread: makes streams that the bus has lost, and looks for orders that are
/// over, and for such as the database does not know.
void CentreProgram::sweep() {
    do {
        try {
            sweepOnce();
        } catch (const std::future_error&) {
            return;  // it ends
        } catch (const std::exception& error) {
            say(Priority::Warning, std::string("the sweep: ") + error.what());
        }
    } while (sweeper_->pause(settings_.sweepTime));
}

std::vector<std::string> CentreProgram::ownKeys() const {
    std::vector<std::string> keys = settings_.earlierKeys;
    keys.push_back(settings_.key.publicKey());
    return keys;
}

void CentreProgram::sweepOnce() {
    ensureStreams();
    const SubjectsResult found =
        subjectsOf(*connection_, kTasksStream, kTaskSubjects, kStreamAnswerTime);
    if (!found.status.done()) {
        say(Priority::Warning, "the orders on the bus cannot be listed: " + found.status.text);
    }
    for (const std::string& subject : found.subjects) {
        // Each waits for its turn, so that nobody waits for all of them.
        ask([this, subject](Parts&) {
            return checkOnBus(subject, [this](const OrderRecord& order) {
                centre_->foundOnBus(order, wallClock());
            });
        }).get();
    }
}

bool CentreProgram::checkOnBus(const std::string& subject, const TellFound& tell) {
    const auto place = placeOf(subject);
    if (!place) return true;
    const auto& [host, number] = *place;
    if (const std::optional<OrderRecord> known = store_.orderAt(host, number)) {
        if (known->outcome) tell(*known);
        return true;
    }
    const FetchAnswer answer = bus_->fetch({{host, number}}).front();
    if (std::holds_alternative<Unanswered>(answer)) return false;
    const auto* const stored = std::get_if<StoredOrder>(&answer);
    if (stored == nullptr) return true;
    // Only what this centre has signed itself counts.
    const std::optional<NumberedOrder> numbered =
        readNumber(stored->bytes, host, number, ownKeys());
    if (!numbered) return true;
    OrderRecord order;
    order.host = host;
    order.number = number;
    order.order = numbered->order;
    order.bytes = stored->bytes;
    tell(order);
    return true;
}

}  // namespace fleet
