/// zavlink: carries out what a link decides.
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "fleet/link/core/link.h"
#include "fleet/link/facts/facts_teller.h"
#include "fleet/link/files/file_side.h"
#include "fleet/link/metrics/link_metrics.h"
#include "fleet/link/metrics/metrics_file.h"
#include "fleet/link/program/bus_side.h"
#include "fleet/link/program/host_side.h"
#include "fleet/link/program/link_configuration.h"
#include "fleet/link/program/link_memory.h"
#include "fleet/link/questions/output_side.h"
#include "fleet/link/questions/question_judge.h"
#include "fleet/link/questions/question_side.h"
#include "fleet/loop/mailbox.h"

namespace fleet {

/// What a link works with. zavlink has one link, with a file and a host on the same machine;
/// whoever runs thousands of links in one process has them share what can be shared.
struct LinkParts {
    std::unique_ptr<LinkMemory> memory;
    /// Called once, while the link is made.
    std::function<std::unique_ptr<HostSide>(HostSide::Events)> host;
    bool sharesThreads = false;  ///< see ConnectionOptions
    /// Something has come for work(). Any thread; it must return soon and throw nothing. May be
    /// empty.
    std::function<void()> hasWork = {};
};

/// The link's decisions, fed by the bus and the host, each of which is talked to on threads of its
/// own. The decisions themselves, and the file, belong to the thread of run(), or of work().
class LinkProgram {
public:
    /// Why run() returned.
    enum class End {
        Asked,    ///< end() was called
        Stopped,  ///< this link must not run: starting it again would not help
    };

    /// Throws FileError when the link's file cannot be used, or another process uses it.
    explicit LinkProgram(const LinkConfiguration& configuration);
    LinkProgram(const LinkConfiguration& configuration, LinkParts parts);
    ~LinkProgram();
    LinkProgram(const LinkProgram&) = delete;
    LinkProgram& operator=(const LinkProgram&) = delete;

    /// Works until it is asked to end, or must not go on. Throws FileError when what must not be
    /// forgotten cannot be written: nothing is done then that relies on it.
    End run();
    /// In the place of run(), for a loop that many links share: does what there is to do, and never
    /// waits for more. To be called when something has come, and once a second. Tells why the link
    /// has ended, once it has; throws as run() does.
    std::optional<End> work();
    /// Any thread, at any time.
    void end();
    /// The host's bus key.
    const std::string& host() const { return memory_->bus().publicKey(); }

private:
    /// The time, which goes on as it should when somebody puts the clock back.
    Moment now();
    ConnectionOptions busOptions(const LinkConfiguration& configuration, bool sharesThreads) const;
    Trust trust(const LinkConfiguration& configuration) const;
    LinkSettings settings() const;
    FileSideSettings fileSettings(const LinkConfiguration& configuration) const;
    HostSide::Events hostEvents();
    BusSide::Events busEvents();

    /// Has the link told something on the thread of run(), and carries out what it wants then.
    template <typename Tell>
    void tell(Tell tell);
    void tickIfDue();
    void carryOut(const Actions& actions);
    void apply(const ReadOrder& action);
    void apply(const PrepareFiles& action);
    void apply(const HandOver& action);
    void apply(const EnterEnd& action);
    void apply(const CancelTask& action);
    void apply(const LookUp& action);
    void apply(const Report& action);
    void apply(const Keep& action);
    void apply(const SayHello& action);
    void apply(const StopLink& action);
    void noteRecorded(Number number, const HandOverAnswer& answer, Moment now);
    void sayWhatBlocks();
    void tellMetrics();
    Facts ownFacts(const LinkConfiguration& configuration) const;
    void tellFacts();
    void consider(const std::string& question);
    void considerEarly();

    Mailbox mailbox_;
    Mailbox::Clock::time_point nextTick_ = Mailbox::Clock::now();
    const std::unique_ptr<LinkMemory> memory_;
    Moment latest_{};
    std::chrono::steady_clock::time_point latestAt_ = std::chrono::steady_clock::now();
    std::atomic<bool> isSeenWaiting_{false};
    std::atomic<bool> isChangeWaiting_{false};
    std::atomic<std::size_t> waitingQuestions_{0};
    std::vector<std::string> early_;  ///< questions that wait for the first reply
    const Trust trust_;
    QuestionBook questionBook_;
    LinkCounts counts_;
    MetricsFile metricsFile_;
    bool isConnected_ = false;
    std::optional<Moment> replied_;  ///< when the centre's latest reply came
    Link link_;
    FactsTeller facts_;
    std::string journal_;  ///< the host's, as it was last told; "" while no host answers
    std::string blocked_;  ///< what was last said of it
    std::optional<End> end_;
    // They end first: their threads use everything above.
    std::unique_ptr<FileSide> files_;  ///< the bus's threads use it, too
    std::unique_ptr<BusSide> bus_;
    std::unique_ptr<HostSide> host_;
    std::unique_ptr<QuestionSide> questions_;
    std::unique_ptr<OutputSide> outputs_;
};

}  // namespace fleet
