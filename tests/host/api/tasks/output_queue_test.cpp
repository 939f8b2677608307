#include "host/api/tasks/output_queue.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

using host::OutputPosition;
using host::OutputQueue;
using host::Task;
using host::TaskState;

std::string event(const std::string& stream, const std::string& text) {
    return "data: {\"stream\":\"" + stream + "\",\"text\":\"" + text + "\"}\n\n";
}
std::string ending(const std::string& state) {
    return "event: end\ndata: {\"state\":\"" + state + "\"}\n\n";
}

class Output : public testing::Test {
protected:
    static Task taskWith(const std::string& out, const std::string& err = "") {
        Task task;
        task.state = TaskState::Running;
        host::Command& command = task.commands.emplace_back();
        command.number = 1;
        command.out.append(out);
        command.err.append(err);
        return task;
    }
    void push(const std::string& text, std::uint64_t end, bool isError = false) {
        queue.push({1, isError, text, end});
    }

    /// The end of a task whose commands were all heard.
    void end(TaskState state) {
        Task over;
        over.state = state;
        queue.end(over);
    }

    /// What there is now, without the identifiers.
    std::string taken() { return withoutIdentifiers(queue.take()); }
    static std::string withoutIdentifiers(const std::string& events) {
        std::string rest;
        std::istringstream lines(events);
        for (std::string line; std::getline(lines, line);) {
            if (line.rfind("id: ", 0) != 0) rest += line + '\n';
        }
        return rest;
    }
    /// What a reader gets of a task that he has followed up to a position.
    std::string rest(const OutputPosition& after, const Task& task) const {
        OutputQueue resumed(codePage, kRun, after);
        resumed.begin(task);
        return withoutIdentifiers(resumed.take());
    }

    static constexpr std::int64_t kRun = 7;
    const host::CodePage codePage{"UTF-8"};
    OutputQueue queue{codePage, kRun};
};

TEST_F(Output, IsWhatIsKeptThenWhatComesThenTheEnd) {
    queue.begin(taskWith("one\n", "bad\n"));
    push("two\n", 8);
    EXPECT_EQ(taken(),
              event("stdout", "one\\n") + event("stderr", "bad\\n") + event("stdout", "two\\n"));
    EXPECT_TRUE(queue.empty());
    EXPECT_FALSE(queue.over());
    push("three\n", 14);
    end(TaskState::Done);
    push("late\n", 19);
    EXPECT_FALSE(queue.over()) << "not everything was taken";
    EXPECT_EQ(taken(), event("stdout", "three\\n") + ending("done"));
    EXPECT_TRUE(queue.over());
    EXPECT_TRUE(queue.empty());
}

TEST_F(Output, HasNoPieceTwice) {
    push("one", 3);
    push("two", 6);
    push("bad", 3, true);
    EXPECT_TRUE(queue.empty()) << "what is kept comes first";
    queue.begin(taskWith("one"));
    EXPECT_EQ(taken(), event("stdout", "one") + event("stdout", "two") + event("stderr", "bad"));
}

TEST_F(Output, ThatWasKeptBeforeItIsHeardComesOnce) {
    queue.begin(taskWith("one\n"));
    push("one\n", 4);
    push("two\n", 8);
    EXPECT_EQ(taken(), event("stdout", "one\\n") + event("stdout", "two\\n"));
}

TEST_F(Output, ThatWasNeverHeardComesWithTheEnd) {
    queue.begin(taskWith("one\n"));
    Task over = taskWith("one\ntwo\n", "bad\n");
    over.state = TaskState::Done;
    queue.end(over);
    EXPECT_EQ(taken(), event("stdout", "one\\n") + event("stdout", "two\\n") +
                           event("stderr", "bad\\n") + ending("done"));
}

TEST_F(Output, OfAnEarlierRunComesOnce) {
    Task task = taskWith("one\n");
    task.commands[0].number = 0;
    queue.begin(task);
    task.state = TaskState::Done;
    queue.end(task);
    EXPECT_EQ(taken(), event("stdout", "one\\n") + ending("done"));
}

TEST_F(Output, OfATaskThatEndsMeanwhileIsAllOfIt) {
    Task over = taskWith("one\ntwo\n");
    over.state = TaskState::Done;
    push("two\n", 8);
    queue.end(over);
    queue.begin(taskWith("one\n"));
    EXPECT_EQ(taken(), event("stdout", "one\\ntwo\\n") + ending("done"));
}

TEST_F(Output, OfATaskThatIsOverIsWhatIsKept) {
    push("one", 3);
    end(TaskState::Failed);
    Task task = taskWith("one");
    task.state = TaskState::Failed;
    task.commands[0].number = 0;
    queue.begin(task);
    EXPECT_EQ(taken(), event("stdout", "one") + ending("failed"));
}

TEST_F(Output, KeepsCharactersOfSeveralBytesWhole) {
    queue.begin(taskWith("a\xC3"));
    push(
        "\xA4"
        "b",
        4);
    EXPECT_EQ(taken(), event("stdout", "a") + event("stdout",
                                                    "\xC3\xA4"
                                                    "b"));
    push("\xE2\x82", 6);
    EXPECT_EQ(taken(), "");
    end(TaskState::Done);
    EXPECT_EQ(taken(), event("stdout", "\xEF\xBF\xBD") + ending("done"));
}

TEST_F(Output, ThatDoesNotFitIsCounted) {
    queue.begin(taskWith(""));
    const std::string half(OutputQueue::kMostBytes / 2, 'x');
    push(half, half.size());
    push(half, 2 * half.size());
    push("yz", 2 * half.size() + 2);
    EXPECT_EQ(taken(), event("stdout", half) + "event: overflow\ndata: {\"lost\":" +
                           std::to_string(half.size() + 2) + "}\n\n");
    push("on", 2 * half.size() + 4);
    EXPECT_EQ(taken(), event("stdout", "on"));
}

TEST_F(Output, HasPositions) {
    queue.begin(taskWith("one\n", "bad\n"));
    push("two\xC3", 8);
    EXPECT_EQ(queue.take(), "id: 7-4-0\n" + event("stdout", "one\\n") + "id: 7-4-4\n" +
                                event("stderr", "bad\\n") + "id: 7-7-4\n" + event("stdout", "two"))
        << "a character that is cut comes with its rest";
}

TEST_F(Output, GoesOnBehindAPosition) {
    OutputQueue resumed(codePage, kRun, OutputPosition{kRun, {6, 4}});
    resumed.begin(taskWith("one\ntwo\n", "bad\n"));
    resumed.push({1, true, "worse\n", 10});
    resumed.push({2, false, "three\n", 6});
    EXPECT_EQ(resumed.take(), "id: 7-8-4\n" + event("stdout", "o\\n") + "id: 7-8-10\n" +
                                  event("stderr", "worse\\n") + "id: 7-14-10\n" +
                                  event("stdout", "three\\n"));
}

TEST_F(Output, GoesOnBehindAPositionThatIsKeptNoMore) {
    Task task = taskWith(std::string(host::Tail::kBytes, 'x'));
    task.commands[0].out.append("end");
    const std::string kept = std::string(host::Tail::kBytes - 3, 'x') + "end";
    EXPECT_EQ(rest({kRun, {1, 0}}, task), event("stdout", kept));
    EXPECT_EQ(rest({kRun, {host::Tail::kBytes + 2, 0}}, task), event("stdout", "d"));
}

TEST_F(Output, ComesWholeForAPositionInAnotherRun) {
    EXPECT_EQ(rest({kRun - 1, {4, 0}}, taskWith("one\n")), event("stdout", "one\\n"));
}

TEST_F(Output, OfAnEarlierRunGoesOnIfItIsKnownWhere) {
    Task over = taskWith("one\ntwo\n");
    over.state = TaskState::Done;
    over.run = kRun - 1;
    over.commands[0].number = 0;
    EXPECT_EQ(rest({kRun - 1, {4, 0}}, over), event("stdout", "two\\n"));
    const std::string kept(host::Tail::kBytes, 'x');
    over.commands[0].out.append(kept);
    EXPECT_EQ(rest({kRun - 1, {4, 0}}, over), event("stdout", kept));
}

TEST_F(Output, WakesItsReader) {
    int woken = 0;
    queue.begin(taskWith(""));
    queue.onContent([&woken] { ++woken; });
    const int before = woken;
    push("one", 3);
    EXPECT_EQ(woken, before + 1);
    end(TaskState::Done);
    EXPECT_EQ(woken, before + 2);
}

}  // namespace
