#include "fleet/link/program/link_program.h"

#include <algorithm>
#include <chrono>
#include <random>
#include <utility>
#include <variant>

#include "fleet/bus/accounts/fleet_accounts.h"
#include "fleet/bus/messages/order.h"
#include "fleet/files/files.h"
#include "fleet/link/program/link_file.h"
#include "fleet/link/program/machine.h"
#include "fleet/link/program/socket_host.h"
#include "fleet/link/questions/answer_pieces.h"
#include "fleet/log/log.h"

namespace fleet {
namespace {

using std::chrono::seconds;

/// What is told of why the host is blocked: the words may be the centre's.
constexpr std::size_t kLongestBlocked = 1024;

/// Questions that wait for a look at them.
constexpr std::size_t kMostQuestions = 16;

/// 20 to 40 seconds.
Moment drawnPause() {
    thread_local std::mt19937 dice{std::random_device{}()};
    return Moment(std::uniform_int_distribution<Moment::rep>(20'000, 40'000)(dice));
}

/// Those of the one link on a machine.
LinkParts partsOf(const LinkConfiguration& configuration) {
    LinkParts parts;
    parts.memory = std::make_unique<LinkFile>(configuration.state);
    parts.host = [socket = configuration.hostSocket](HostSide::Events events) {
        return std::make_unique<SocketHost>(socket, std::move(events));
    };
    return parts;
}

}  // namespace

LinkProgram::LinkProgram(const LinkConfiguration& configuration)
    : LinkProgram(configuration, partsOf(configuration)) {}

LinkProgram::LinkProgram(const LinkConfiguration& configuration, LinkParts parts)
    : mailbox_(std::move(parts.hasWork)),
      memory_(std::move(parts.memory)),
      latest_(memory_->kept().latest),
      trust_(trust(configuration)),
      metricsFile_(configuration.metrics),
      link_(settings(), memory_->kept()),
      facts_(ownFacts(configuration)) {
    files_ = std::make_unique<FileSide>(fileSettings(configuration));
    bus_ = std::make_unique<BusSide>(busOptions(configuration, parts.sharesThreads), trust_,
                                     memory_->bus(), memory_->signing(), busEvents());
    questions_ = std::make_unique<QuestionSide>(configuration.hostSocket);
    outputs_ = std::make_unique<OutputSide>(
        trust_.host, memory_->signing(), configuration.hostSocket,
        [this](std::string piece) { bus_->answer({std::move(piece)}); });
    host_ = parts.host(hostEvents());
}

LinkProgram::~LinkProgram() {
    // Their answers go to the bus.
    outputs_.reset();
    questions_.reset();
    // Each of these may still put letters into the mailbox, and nothing else.
    host_.reset();
    bus_.reset();
    files_.reset();
}

ConnectionOptions LinkProgram::busOptions(const LinkConfiguration& configuration,
                                          bool sharesThreads) const {
    ConnectionOptions options;
    options.urls = configuration.bus;
    if (!configuration.ca.empty()) {
        options.tls = TlsOptions{configuration.ca, configuration.serverName};
    }
    options.credentials =
        UserToken{[token = memory_->token()] { return token; },
                  [key = memory_->bus()](std::string_view nonce) { return key.sign(nonce); }};
    options.name = configuration.name;
    options.inboxPrefix = inboxPrefixOf(memory_->bus().publicKey());
    options.sharesThreads = sharesThreads;
    return options;
}

Trust LinkProgram::trust(const LinkConfiguration& configuration) const {
    Trust trusted;
    trusted.fleet = configuration.fleet;
    trusted.host = memory_->bus().publicKey();
    trusted.name = configuration.name;
    trusted.labels = configuration.labels;
    trusted.root = configuration.root;
    trusted.centres = configuration.centres;
    return trusted;
}

Facts LinkProgram::ownFacts(const LinkConfiguration& configuration) const {
    Facts own;
    own.host = memory_->bus().publicKey();
    own.name = configuration.name;
    own.labels = configuration.labels;
    own.link = ZAV_VERSION;
    return own;
}

Moment LinkProgram::now() {
    const auto steady = std::chrono::steady_clock::now();
    const auto wall = wallClock();
    const auto passed = std::chrono::duration_cast<Moment>(steady - latestAt_);
    latest_ = std::max(wall, latest_ + passed);
    latestAt_ = steady;
    return latest_;
}

FileSideSettings LinkProgram::fileSettings(const LinkConfiguration& configuration) const {
    FileSideSettings settings{{configuration.fleet, configuration.url, "", memory_->signing()},
                              configuration.state + "/spool",
                              configuration.hostSocket};
    if (!configuration.url.empty()) {
        settings.source.authority = readFile(configuration.ca, Secrecy::Public);
    }
    return settings;
}

LinkSettings LinkProgram::settings() const {
    LinkSettings made;
    made.host = memory_->bus().publicKey();
    made.session = makeOrderId();
    made.machine = machineIdentity(made.host);
    made.nonce = makeOrderId;
    made.pause = drawnPause;
    return made;
}

template <typename Tell>
void LinkProgram::tell(Tell tell) {
    mailbox_.put([this, tell = std::move(tell)] { carryOut(tell(link_, now())); });
}

HostSide::Events LinkProgram::hostEvents() {
    HostSide::Events events;
    events.isThere = [this](const std::string& journal, std::set<std::string> unfinished) {
        mailbox_.put([this, journal, unfinished = std::move(unfinished)] {
            if (std::exchange(journal_, journal) != journal) {
                say(Priority::Info, "the host answers; its journal is " + journal);
            }
            facts_.hostIs(journal, now());
            carryOut(link_.hostIs(journal, unfinished, now()));
        });
    };
    events.isAway = [this] {
        mailbox_.put([this] {
            if (!std::exchange(journal_, "").empty()) say(Priority::Warning, "the host is away");
            facts_.hostIsAway();
            carryOut(link_.hostIsAway(now()));
        });
    };
    events.ended = [this](Outcome outcome) {
        tell([outcome = std::move(outcome)](Link& link, Moment at) {
            return link.ended(outcome, at);
        });
    };
    events.tasksChanged = [this] {
        // A host tells of many; one letter at a time is enough.
        if (isChangeWaiting_.exchange(true)) return;
        mailbox_.put([this] {
            isChangeWaiting_ = false;
            facts_.tasksChanged(now());
        });
    };
    return events;
}

BusSide::Events LinkProgram::busEvents() {
    BusSide::Events events;
    events.connected = [this] {
        mailbox_.put([this] {
            say(Priority::Info, "connected to the bus");
            isConnected_ = true;
            facts_.connected();
            carryOut(link_.connected(now()));
        });
    };
    events.disconnected = [this] {
        mailbox_.put([this] {
            say(Priority::Warning, "the bus is away");
            if (std::exchange(isConnected_, false)) counts_.disconnected.add();
            facts_.disconnected();
            link_.disconnected();
        });
    };
    events.seen = [this](Number number) {
        // Others may say so without end; one letter at a time is enough.
        if (isSeenWaiting_.exchange(true)) return;
        tell([this, number](Link& link, Moment at) {
            isSeenWaiting_ = false;
            return link.seen(number, at);
        });
    };
    events.read = [this](Number number, Directive directive) {
        if (directive.refusal.empty() && directive.hasFiles) files_->fetchAhead(directive);
        tell([number, directive = std::move(directive)](Link& link, Moment at) {
            return link.read(number, directive, at);
        });
    };
    events.missing = [this](Number number) {
        tell([number](Link& link, Moment at) { return link.missing(number, at); });
    };
    events.unanswered = [this](Number number) {
        tell([number](Link& link, Moment at) { return link.unanswered(number, at); });
    };
    events.replied = [this](Reply reply) {
        mailbox_.put([this, reply = std::move(reply)] {
            replied_ = now();
            carryOut(link_.replied(reply, *replied_));
            considerEarly();
        });
    };
    events.asked = [this](const std::string& bytes) {
        // Those beyond are lost, as on the bus.
        if (waitingQuestions_ >= kMostQuestions) return;
        ++waitingQuestions_;
        mailbox_.put([this, bytes] {
            --waitingQuestions_;
            consider(bytes);
        });
    };
    events.unheard = [this](const std::string& nonce) {
        counts_.unheard.add();
        tell([nonce](Link& link, Moment at) { return link.unheard(nonce, at); });
    };
    return events;
}

LinkProgram::End LinkProgram::run() {
    while (!end_) {
        if (const std::optional<Mailbox::Letter> letter = mailbox_.take(nextTick_)) (*letter)();
        tickIfDue();
    }
    return *end_;
}

std::optional<LinkProgram::End> LinkProgram::work() {
    while (!end_) {
        const std::optional<Mailbox::Letter> letter = mailbox_.take(Mailbox::Clock::time_point());
        if (!letter) break;
        (*letter)();
    }
    tickIfDue();
    return end_;
}

void LinkProgram::tickIfDue() {
    if (end_ || Mailbox::Clock::now() < nextTick_) return;
    nextTick_ = Mailbox::Clock::now() + seconds(1);
    carryOut(link_.tick(now()));
    sayWhatBlocks();
    tellFacts();
    tellMetrics();
}

void LinkProgram::tellMetrics() {
    const auto at = MetricsFile::Clock::now();
    if (!metricsFile_.isDue(at)) return;
    const LinkScrape scrape{counts_,
                            isConnected_,
                            !journal_.empty(),
                            !link_.blocked().empty(),
                            link_.kept().taken,
                            bus_->unsignedNumbers(),
                            replied_,
                            metrics::readProcessFigures()};
    metricsFile_.write(scrape, at);
}

void LinkProgram::end() {
    mailbox_.put([this] {
        if (!end_) end_ = End::Asked;
    });
}

void LinkProgram::sayWhatBlocks() {
    if (std::exchange(blocked_, link_.blocked()) == link_.blocked()) return;
    if (blocked_.empty()) return say(Priority::Info, "orders are handed over again");
    say(Priority::Notice, "the next order waits: " + blocked_);
}

void LinkProgram::tellFacts() {
    facts_.blockedIs(link_.blocked().substr(0, kLongestBlocked));
    if (facts_.wantsLook(now())) {
        host_->look([this](std::optional<HostLook> look) {
            mailbox_.put([this, look = std::move(look)] { facts_.found(look, now()); });
        });
    }
    if (std::optional<Facts> facts = facts_.next(now())) {
        bus_->tell(std::move(*facts), [this](bool isStored) {
            mailbox_.put([this, isStored] { facts_.stored(isStored); });
        });
    }
}

/// Questions that came before the link knew whose key was revoked.
void LinkProgram::considerEarly() {
    if (!link_.knowsRevoked()) return;
    for (const std::string& question : std::exchange(early_, {}))
        consider(question);
}

void LinkProgram::consider(const std::string& question) {
    if (!link_.knowsRevoked()) {
        if (early_.size() < kMostQuestions) early_.push_back(question);
        return;
    }
    const Moment at = now();
    const auto isRevoked = [this](const std::string& key) { return link_.isRevoked(key); };
    const std::optional<AskedQuestion> asked = judgeQuestion(question, trust_, at, isRevoked);
    if (!asked || !questionBook_.enter(asked->id, asked->expires, at)) return;
    counts_.questions.add();
    if (asked->kind == kAsksOutput) return outputs_->ask(*asked);
    questions_->answer(*asked, at, [this, asked = *asked](const std::string& text) {
        bus_->answer(answerPieces(trust_.host, asked, text, memory_->signing()));
    });
}

void LinkProgram::carryOut(const Actions& actions) {
    for (const Action& action : actions) {
        if (end_) return;
        std::visit([this](const auto& one) { apply(one); }, action);
    }
}

void LinkProgram::apply(const ReadOrder& action) {
    bus_->read(action.number);
}

void LinkProgram::apply(const PrepareFiles& action) {
    files_->prepare(action.directive, [this, number = action.directive.number](
                                          const PrepareAnswer& answer) {
        tell([number, answer](Link& link, Moment at) { return link.prepared(number, answer, at); });
    });
}

void LinkProgram::apply(const HandOver& action) {
    say(Priority::Info, "order " + std::to_string(action.directive.number) + " (" +
                            action.directive.order + ") goes to the host");
    counts_.handedOver.add();
    host_->handOver(action, [this, number = action.directive.number](const HandOverAnswer& answer) {
        mailbox_.put([this, number, answer] { noteRecorded(number, answer, now()); });
    });
}

void LinkProgram::apply(const EnterEnd& action) {
    say(Priority::Notice, "order " + std::to_string(action.directive.number) + " (" +
                              action.directive.order + ") is recorded as " + action.state + ": " +
                              action.reason);
    counts_.entered.add();
    host_->enter(action, [this, number = action.directive.number](const HandOverAnswer& answer) {
        mailbox_.put([this, number, answer] { noteRecorded(number, answer, now()); });
    });
}

void LinkProgram::noteRecorded(Number number, const HandOverAnswer& answer, Moment at) {
    if (std::holds_alternative<OtherJournal>(answer)) host_->lookAgain();
    carryOut(link_.recorded(number, answer, at));
}

void LinkProgram::apply(const CancelTask& action) {
    host_->cancel(action.order, journal_, [this, by = action.by](const CancelAnswer& answer) {
        tell([by, answer](Link& link, Moment at) { return link.cancelled(by, answer, at); });
    });
}

void LinkProgram::apply(const LookUp& action) {
    host_->lookUp(action.order, journal_, [this, order = action.order](const LookUpAnswer& answer) {
        tell([order, answer](Link& link, Moment at) { return link.found(order, answer, at); });
    });
}

void LinkProgram::apply(const Report& action) {
    counts_.reported.add();
    bus_->report(action.outcome);
}

void LinkProgram::apply(const Keep& action) {
    memory_->keep(action.kept);
}

void LinkProgram::apply(const SayHello& action) {
    counts_.hellos.add();
    if (!action.listWanted || journal_.empty()) return bus_->sayHello(action.hello);
    host_->listOrders(journal_, [this, hello = action.hello](
                                    const std::optional<std::vector<std::string>>& orders) mutable {
        if (orders) {
            hello.have.emplace();
            for (const std::string& order : *orders)
                hello.have->push_back({order, 0});
        }
        bus_->sayHello(std::move(hello));
    });
}

void LinkProgram::apply(const StopLink& action) {
    say(Priority::Error, "this link must not go on: " + action.reason);
    end_ = End::Stopped;
}

}  // namespace fleet
