#include "host/api/tasks/output_queue.h"

#include <gtest/gtest.h>

namespace {

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

    const host::CodePage codePage{"UTF-8"};
    OutputQueue queue{codePage};
};

TEST_F(Output, IsWhatIsKeptThenWhatComesThenTheEnd) {
    queue.begin(taskWith("one\n", "bad\n"));
    push("two\n", 8);
    EXPECT_EQ(queue.take(),
              event("stdout", "one\\n") + event("stderr", "bad\\n") + event("stdout", "two\\n"));
    EXPECT_TRUE(queue.empty());
    EXPECT_FALSE(queue.over());
    push("three\n", 14);
    end(TaskState::Done);
    push("late\n", 19);
    EXPECT_FALSE(queue.over()) << "not everything was taken";
    EXPECT_EQ(queue.take(), event("stdout", "three\\n") + ending("done"));
    EXPECT_TRUE(queue.over());
    EXPECT_TRUE(queue.empty());
}

TEST_F(Output, HasNoPieceTwice) {
    push("one", 3);
    push("two", 6);
    push("bad", 3, true);
    EXPECT_TRUE(queue.empty()) << "what is kept comes first";
    queue.begin(taskWith("one"));
    EXPECT_EQ(queue.take(),
              event("stdout", "one") + event("stdout", "two") + event("stderr", "bad"));
}

TEST_F(Output, ThatWasKeptBeforeItIsHeardComesOnce) {
    queue.begin(taskWith("one\n"));
    push("one\n", 4);
    push("two\n", 8);
    EXPECT_EQ(queue.take(), event("stdout", "one\\n") + event("stdout", "two\\n"));
}

TEST_F(Output, ThatWasNeverHeardComesWithTheEnd) {
    queue.begin(taskWith("one\n"));
    Task over = taskWith("one\ntwo\n", "bad\n");
    over.state = TaskState::Done;
    queue.end(over);
    EXPECT_EQ(queue.take(), event("stdout", "one\\n") + event("stdout", "two\\n") +
                                event("stderr", "bad\\n") + ending("done"));
}

TEST_F(Output, OfAnEarlierRunComesOnce) {
    Task task = taskWith("one\n");
    task.commands[0].number = 0;
    queue.begin(task);
    task.state = TaskState::Done;
    queue.end(task);
    EXPECT_EQ(queue.take(), event("stdout", "one\\n") + ending("done"));
}

TEST_F(Output, OfATaskThatEndsMeanwhileIsAllOfIt) {
    Task over = taskWith("one\ntwo\n");
    over.state = TaskState::Done;
    push("two\n", 8);
    queue.end(over);
    queue.begin(taskWith("one\n"));
    EXPECT_EQ(queue.take(), event("stdout", "one\\ntwo\\n") + ending("done"));
}

TEST_F(Output, OfATaskThatIsOverIsWhatIsKept) {
    push("one", 3);
    end(TaskState::Failed);
    Task task = taskWith("one");
    task.state = TaskState::Failed;
    task.commands[0].number = 0;
    queue.begin(task);
    EXPECT_EQ(queue.take(), event("stdout", "one") + ending("failed"));
}

TEST_F(Output, KeepsCharactersOfSeveralBytesWhole) {
    queue.begin(taskWith("a\xC3"));
    push(
        "\xA4"
        "b",
        4);
    EXPECT_EQ(queue.take(), event("stdout", "a") + event("stdout",
                                                         "\xC3\xA4"
                                                         "b"));
    push("\xE2\x82", 6);
    EXPECT_EQ(queue.take(), "");
    end(TaskState::Done);
    EXPECT_EQ(queue.take(), event("stdout", "\xEF\xBF\xBD") + ending("done"));
}

TEST_F(Output, ThatDoesNotFitIsCounted) {
    queue.begin(taskWith(""));
    const std::string half(OutputQueue::kMostBytes / 2, 'x');
    push(half, half.size());
    push(half, 2 * half.size());
    push("yz", 2 * half.size() + 2);
    EXPECT_EQ(queue.take(), event("stdout", half) + "event: overflow\ndata: {\"lost\":" +
                                std::to_string(half.size() + 2) + "}\n\n");
    push("on", 2 * half.size() + 4);
    EXPECT_EQ(queue.take(), event("stdout", "on"));
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
