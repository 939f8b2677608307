/// The centre at work: its decisions, its database and its connection to the bus.
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <future>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/nats/lease.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/loop/mailbox.h"
#include "fleet/loop/worker.h"
#include "fleet/server/core/centre.h"
#include "fleet/server/core/centre_counts.h"
#include "fleet/server/program/hello_limit.h"
#include "fleet/server/program/host_feed.h"
#include "fleet/server/program/lease_term.h"
#include "fleet/server/program/nats_centre_bus.h"
#include "fleet/server/program/question_desk.h"
#include "fleet/server/program/told_labels.h"
#include "fleet/server/store/centre_database.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "sqlite/transaction.h"

namespace fleet {

struct CentreParts;

/// What a centre needs to work.
struct CentreSettings {
    std::string directory;  ///< of its database
    ConnectionOptions bus;
    KeyPair key;  ///< signs numbers and replies
    StreamLimits limits;
    std::string holder;  ///< who it is, for another centre that finds the lease taken
    /// A lease is free when it is older; it is renewed three times as often.
    std::chrono::milliseconds leaseTerm = std::chrono::seconds(30);
    /// Between two looks for orders that are over and still on the bus.
    std::chrono::milliseconds sweepTime = std::chrono::hours(1);
    /// Signing keys of operators that count no longer. Called on the thread of run().
    std::function<std::vector<std::string>()> revoked = {};
    Centre::TellAlarm alarm = {};  ///< called on the thread of run()
    /// Called once before anything else, and then each second as a transaction of its own; again at
    /// once while it returns true. On the thread of run(). May be empty.
    std::function<bool(CentreParts& parts, Moment now)> attend = {};
    /// Called once, within the transaction that completes a database which was put back from a
    /// backup. On the thread of run(). May be empty.
    std::function<void(CentreParts& parts, Moment now)> putBack = {};
    /// Called when the bus's store does not answer although the bus does. May be empty.
    std::function<void()> storeAway = {};
    std::vector<std::string> earlierKeys = {};  ///< public keys that have numbered orders before
};

/// What the last hello of a host has told. Only in memory: half a minute after a start it is there
/// again.
struct HostNews {
    Moment heard{};  ///< when it came
    Number taken = 0;
    std::string blocked;
    std::string journalNow;
    Moment skew{};  ///< how far its clock is ahead of the centre's
};

/// What the functions given to a CentreProgram may use.
struct CentreParts {
    Centre& centre;
    CentreStore& store;
    sqlite::Database& database;
    const std::map<std::string, HostNews>& news;  ///< by the hosts' bus keys
};

/// One centre of a fleet: as long as another one has the lease it waits.
class CentreProgram {
public:
    enum class End {
        Asked,     ///< end() was called
        LeaseLost  ///< lease or bus: another centre may work now; starting anew waits for both
    };

    /// Opens the database. Throws StoreError.
    explicit CentreProgram(CentreSettings settings);
    ~CentreProgram();
    CentreProgram(const CentreProgram&) = delete;
    CentreProgram& operator=(const CentreProgram&) = delete;

    /// Works until it is asked to end or must not go on. Throws sqlite::DatabaseError when the
    /// database fails.
    End run();
    /// Any thread, at any time.
    void end();

    using Parts = CentreParts;
    /// Runs on the thread of run() as one transaction of the database. The future is ready when
    /// that is durable, and has what the function has returned; or what it has thrown, and then
    /// nothing has changed; or std::future_error, if run() has ended first. Any other thread.
    template <typename Act>
    auto ask(Act act) -> std::future<decltype(act(std::declval<Parts&>()))>;

    /// Gives an order, as its operator has signed it, a number for its host; durable when the
    /// future is ready. Nothing if there is no such host. Throws MessageError through the future
    /// for what is no order. Any thread but that of run().
    std::future<std::optional<Number>> submit(std::string orderBytes);

    /// Whether it has the lease and works. Any thread.
    bool isWorking() const { return isWorking_; }
    /// Whether there is a connection to the bus. Any thread.
    bool isConnected() const { return isConnected_; }
    /// How long ago the lease was claimed or renewed; nothing unless it works. Any thread.
    std::optional<std::chrono::milliseconds> leaseAge() const;
    /// Any thread.
    const CentreCounts& counts() const { return counts_; }
    /// Of all hosts that were heard since the start. Any thread but that of run().
    std::future<std::map<std::string, HostNews>> news();
    /// Any thread.
    QuestionDesk& questions() { return questions_; }
    /// Of all hosts that have ever told some. Any thread.
    const ToldLabels& toldLabels() const { return toldLabels_; }

private:
    void connect();
    void finish();
    bool claim();
    bool ensureStreams();
    void reachAnew();
    void prepareLease();
    bool beginWork();
    std::unique_ptr<Subscription> hear(const std::string& subject,
                                       const Connection::Receiver& receiver);
    bool openQuestions();
    bool completePutBack();
    void loop();
    void readLetters(Mailbox::Letter first);
    bool attend();
    bool workOnBus();
    void takeHello(const BusMessage& message);
    void answerHello(const std::string& host, const std::string& reply, const std::string& bytes);
    bool takeOutcomes(const std::vector<HostFeed::Told>& told);
    bool takeFacts(const std::vector<HostFeed::Told>& told);
    template <typename Take>
    bool takeEach(const std::vector<HostFeed::Told>& told, const char* what, Take take);
    void noteNews(const std::string& host, const Hello& hello, Moment now);
    void sweep();
    void sweepOnce();
    std::vector<std::string> ownKeys() const;
    bool hasLease() const;
    /// False if the bus does not say what is there.
    using TellFound = std::function<void(const OrderRecord&)>;
    bool checkOnBus(const std::string& subject, const TellFound& tell);
    void renewLease();
    void loseLease(const std::string& why);

    const CentreSettings settings_;
    CentreCounts counts_;
    CentreDatabase database_;
    SqliteCentreStore store_;
    Mailbox mailbox_;
    /// What others may know once the changes of this step are durable.
    std::vector<std::function<void()>> afterCommit_;
    std::optional<End> end_;
    std::atomic<bool> isEnding_{false};
    std::atomic<bool> isWorking_{false};  // and the loop reads letters
    std::atomic<bool> isConnected_{false};
    std::atomic<bool> isReaching_{false};  // the connection is closed to make another one
    std::atomic<bool> isBusLost_{false};   // the bus wants this centre no more
    LeaseTerm leaseTerm_;
    std::map<std::string, HostNews> news_;
    ToldLabels toldLabels_;
    QuestionDesk questions_;
    HelloLimit helloLimit_;  ///< belongs to the subscription's thread
    std::atomic<int> waitingHellos_{0};

    // From here on: there while it is connected.
    std::unique_ptr<Connection> connection_;
    std::unique_ptr<Lease> lease_;  ///< the renewer's, once it works
    std::unique_ptr<NatsCentreBus> bus_;
    std::unique_ptr<Centre> centre_;
    std::unique_ptr<Subscription> hellos_;
    std::unique_ptr<Subscription> answers_;
    std::unique_ptr<HostFeed> outcomes_;
    std::unique_ptr<HostFeed> facts_;
    std::unique_ptr<Worker> renewer_;
    std::unique_ptr<Worker> sweeper_;
};

// ---------------------------------------------------------------------------------------------

template <typename Act>
auto CentreProgram::ask(Act act) -> std::future<decltype(act(std::declval<Parts&>()))> {
    using Result = decltype(act(std::declval<Parts&>()));
    const auto promise = std::make_shared<std::promise<Result>>();
    std::future<Result> future = promise->get_future();
    mailbox_.put([this, promise, act = std::move(act)] {
        Parts parts{*centre_, store_, database_.connection(), news_};
        try {
            sqlite::Transaction part(database_.connection());
            const auto result = std::make_shared<Result>(act(parts));
            part.commit();
            afterCommit_.push_back([promise, result] { promise->set_value(std::move(*result)); });
        } catch (...) {
            promise->set_exception(std::current_exception());
        }
    });
    return future;
}

}  // namespace fleet
