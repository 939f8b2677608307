// ctest-label: threaded
#include "embedded/ras1_listener.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "support/host/program.h"
#include "support/process/vfork.h"
#include "support/trace_capture.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

RAS1_UNIT heardUnit{"zavheard"};
RAS1_UNIT otherUnit{"zavother"};
const RAS1_BLOCK heardBlock{&heardUnit, "doWork"};
const RAS1_BLOCK otherBlock{&otherUnit, "doWork"};

/// Traces as a plug-in does: only what the flags ask for.
void trace(RAS1_UNIT& unit, const RAS1_BLOCK& block, unsigned level, const char* text) {
    const unsigned flags = RAS1_Flags(unit);
    if ((flags & RAS1_FLOW) != 0) RAS1_Entry(&block, 1);
    if ((flags & level) != 0) RAS1_Printf(&block, level, 2, "%s", text);
}

class Notes final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override {
        const std::lock_guard<std::mutex> lock(lock_);
        lines_.push_back(std::string(line.unit) + " " + line.function + " " +
                         std::to_string(line.level) + " " + std::string(line.text, line.length));
        threads_.push_back(std::this_thread::get_id());
        errno = EDOM;
    }
    std::vector<std::string> lines() const {
        const std::lock_guard<std::mutex> lock(lock_);
        return lines_;
    }
    std::vector<std::thread::id> threads() const {
        const std::lock_guard<std::mutex> lock(lock_);
        return threads_;
    }

private:
    mutable std::mutex lock_;
    std::vector<std::string> lines_;
    std::vector<std::thread::id> threads_;
};

const std::vector<ras1::HeardUnit> kAllOfOne = {{"zavheard", RAS1_DETAIL | RAS1_ERROR}};

TEST(Listener, HearsTheLinesOfItsUnitsWhichAreNotLogged) {
    const TraceCapture log("ERROR");
    Notes notes;
    const ras1::Listening listening(notes, kAllOfOne);
    trace(heardUnit, heardBlock, RAS1_DETAIL, "found\n");
    trace(heardUnit, heardBlock, RAS1_ERROR, "failed");
    trace(otherUnit, otherBlock, RAS1_DETAIL, "of another unit");
    EXPECT_THAT(notes.lines(),
                ElementsAre("zavheard doWork 1 found\n", "zavheard doWork 128 failed"));
    ASSERT_EQ(log.lines().size(), 1U);
    EXPECT_THAT(log.errors(), ElementsAre("failed"));
}

TEST(Listener, DoesNotChangeWhatIsLogged) {
    const TraceCapture log("ALL");
    Notes notes;
    const ras1::Listening listening(notes, {{"zavheard", RAS1_ERROR}});
    trace(heardUnit, heardBlock, RAS1_DETAIL, "found");
    trace(heardUnit, heardBlock, RAS1_ERROR, "failed");
    EXPECT_THAT(notes.lines(), ElementsAre("zavheard doWork 128 failed"));
    std::string letters;
    for (const TraceLine& line : log.lines())
        letters += line.level;
    EXPECT_EQ(letters, "FDFE");
}

TEST(Listener, HearsTextsThatWereFormattedOrAreLong) {
    const TraceCapture log("ERROR");
    Notes notes;
    const ras1::Listening listening(notes, kAllOfOne);
    const std::string text(5000, 'x');
    ASSERT_NE(RAS1_Flags(heardUnit) & RAS1_DETAIL, 0U);
    RAS1_Printf(&heardBlock, RAS1_DETAIL, 1, "%d of %s", 3, "4");
    RAS1_Printf(&heardBlock, RAS1_DETAIL, 1, "<%s>", text.c_str());
    EXPECT_THAT(notes.lines(),
                ElementsAre("zavheard doWork 1 3 of 4", "zavheard doWork 1 <" + text + ">"));
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST(Listener, HearsNothingBeforeAndAfter) {
    const TraceCapture log("ERROR");
    Notes notes;
    const unsigned before = RAS1_Flags(heardUnit) & (RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR);
    trace(heardUnit, heardBlock, RAS1_DETAIL, "before");
    {
        const ras1::Listening listening(notes, kAllOfOne);
        EXPECT_NE(RAS1_Flags(heardUnit) & RAS1_DETAIL, 0U);
    }
    trace(heardUnit, heardBlock, RAS1_DETAIL, "after");
    trace(heardUnit, heardBlock, RAS1_ERROR, "error after");
    EXPECT_THAT(notes.lines(), IsEmpty());
    EXPECT_EQ(RAS1_Flags(heardUnit) & (RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR), before);
    EXPECT_THAT(log.errors(), ElementsAre("error after"));
}

TEST(Listener, ALineWhoseFlagsWereTestedBeforeTheEndIsNotLoggedAfterIt) {
    const TraceCapture log("ERROR");
    Notes notes;
    {
        const ras1::Listening listening(notes, kAllOfOne);
        ASSERT_NE(RAS1_Flags(heardUnit) & RAS1_DETAIL, 0U);
    }
    RAS1_Flags(heardUnit);  // another thread's
    RAS1_Printf(&heardBlock, RAS1_DETAIL, 1, "%s", "late");
    EXPECT_THAT(notes.lines(), IsEmpty());
    EXPECT_THAT(log.lines(), IsEmpty());
}

TEST(Listener, IsCalledOnTheThreadThatTracesAndLeavesItsErrnoAlone) {
    Notes notes;
    const ras1::Listening listening(notes, kAllOfOne);
    std::thread::id id;
    int error = 0;
    std::thread([&] {
        id = std::this_thread::get_id();
        errno = EXDEV;
        trace(heardUnit, heardBlock, RAS1_DETAIL, "text");
        error = errno;
    }).join();
    EXPECT_THAT(notes.threads(), ElementsAre(id));
    EXPECT_EQ(error, EXDEV);
}

TEST(Listener, IsOneAtATime) {
    Notes notes;
    std::optional<ras1::Listening> first(std::in_place, notes, kAllOfOne);
    EXPECT_THROW(ras1::Listening(notes, kAllOfOne), std::logic_error);
    trace(heardUnit, heardBlock, RAS1_DETAIL, "still");
    EXPECT_EQ(notes.lines().size(), 1U);
    first.reset();
    EXPECT_NO_THROW(ras1::Listening(notes, kAllOfOne));
}

/// Stores what a child on shared memory says.
class ChildNotes final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override {
        process.store(::getpid());
        length.store(line.length);
    }
    std::atomic<pid_t> process{0};
    std::atomic<std::size_t> length{0};
};

[[gnu::noinline]] pid_t traceInVforkedChild() {
    const pid_t child = ::vfork();
    if (child == 0) {
        RAS1_Printf(&heardBlock, RAS1_DETAIL, 1, "%s", "child");
        ::_exit(0);
    }
    return child;
}

TEST(Listener, HearsAChildThatSharesTheMemory) {
    if (!kVforkSharesMemory) GTEST_SKIP() << "the child shares no memory here";
    ChildNotes notes;
    const ras1::Listening listening(notes, kAllOfOne);
    ASSERT_NE(RAS1_Flags(heardUnit) & RAS1_DETAIL, 0U);
    const pid_t child = traceInVforkedChild();
    ASSERT_EQ(::waitpid(child, nullptr, 0), child);
    EXPECT_EQ(notes.process.load(), child);
    EXPECT_EQ(notes.length.load(), 5U);
}

/// Keeps the thread that traces until it is told to go on.
class Gate final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine&) noexcept override {
        entered.store(true);
        while (!open.load())
            std::this_thread::yield();
        left.store(true);
    }
    std::atomic<bool> entered{false};
    std::atomic<bool> open{false};
    std::atomic<bool> left{false};
};

TEST(Listener, TheEndWaitsForCallsInProgress) {
    Gate gate;
    auto listening = std::make_unique<ras1::Listening>(gate, kAllOfOne);
    std::thread tracer([] { trace(heardUnit, heardBlock, RAS1_DETAIL, "text"); });
    ASSERT_TRUE(eventually([&] { return gate.entered.load(); }));
    std::atomic<bool> leftBeforeTheEnd{false};
    std::thread ender([&] {
        listening.reset();
        leftBeforeTheEnd.store(gate.left.load());
    });
    gate.open.store(true);
    ender.join();
    tracer.join();
    EXPECT_TRUE(leftBeforeTheEnd.load());
}

TEST(Listener, ManyThreadsTraceWhileListenersComeAndGo) {
    std::atomic<bool> done{false};
    std::vector<std::thread> tracers;
    for (int i = 0; i < 4; ++i) {
        tracers.emplace_back([&] {
            while (!done.load())
                trace(heardUnit, heardBlock, RAS1_DETAIL, "text");
        });
    }
    std::size_t heard = 0;
    while (heard < 200) {
        Notes notes;
        {
            const ras1::Listening listening(notes, kAllOfOne);
            ASSERT_TRUE(eventually([&] { return !notes.lines().empty(); }));
        }
        heard += notes.lines().size();
    }
    done.store(true);
    for (std::thread& tracer : tracers)
        tracer.join();
}

}  // namespace
