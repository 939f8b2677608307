// What running a script of one line costs against the two usual ways of starting a child with three
// pipes, reading its outputs to their ends and waiting for it; and how the cost grows with the
// output of a command.
//
// Two ways take turns, so that whatever else the machine does meets both alike; a turn of both is
// one iteration. "run" is the median of this library's in microseconds, "ratio" and "p99_ratio" are
// those of the medians and of the 99th percentiles. "/1GiB" holds that much touched memory in 4 KiB
// pages. Forking has benchmarks of its own: copying the page tables of a large process empties the
// caches for whatever runs next.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <stdexcept>
#include <string>
#include <vector>

#include "temporary_file.h"
#include "util/zavutil.h"

namespace {

using Microseconds = std::chrono::duration<double, std::micro>;

struct Pipes {
    int out[2];
    int err[2];
    int in[2];

    Pipes() {
        if (::pipe2(out, O_CLOEXEC) != 0 || ::pipe2(err, O_CLOEXEC) != 0 ||
            ::pipe2(in, O_CLOEXEC) != 0) {
            throw std::runtime_error("no pipes");
        }
    }
};

void readToEnd(int fd) {
    char buffer[16384];
    while (::read(fd, buffer, sizeof buffer) > 0) {
    }
    ::close(fd);
}

void finish(const Pipes& pipes, pid_t pid) {
    ::close(pipes.out[1]);
    ::close(pipes.err[1]);
    ::close(pipes.in[0]);
    ::close(pipes.in[1]);
    readToEnd(pipes.out[0]);
    readToEnd(pipes.err[0]);
    int status = 0;
    if (::waitpid(pid, &status, 0) != pid) throw std::runtime_error("no child");
}

void runWithFork(const char* program) {
    const Pipes pipes;
    const pid_t pid = ::fork();
    if (pid == 0) {
        ::dup2(pipes.out[1], 1);
        ::dup2(pipes.err[1], 2);
        ::dup2(pipes.in[0], 0);
        char* const arguments[] = {const_cast<char*>(program), nullptr};
        ::execve(program, arguments, environ);
        ::_exit(127);
    }
    finish(pipes, pid);
}

void runWithSpawn(const char* program) {
    const Pipes pipes;
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, pipes.out[1], 1);
    ::posix_spawn_file_actions_adddup2(&actions, pipes.err[1], 2);
    ::posix_spawn_file_actions_adddup2(&actions, pipes.in[0], 0);
    char* const arguments[] = {const_cast<char*>(program), nullptr};
    pid_t pid = 0;
    const int error = ::posix_spawn(&pid, program, &actions, nullptr, arguments, environ);
    ::posix_spawn_file_actions_destroy(&actions);
    if (error != 0) throw std::runtime_error("no child");
    finish(pipes, pid);
}

void runCommand(const ZAV::String& command) {
    int rc = -1;
    ZAV::String out;
    ZAV::String err;
    if (!ZAV::Util::runCommand(command, rc, out, err, ZAV::String(), false) || rc != 0) {
        throw std::runtime_error("no run");
    }
}

/// The durations of one way to run a command.
class Samples {
public:
    template <typename Work>
    void time(const Work& work) {
        const auto start = std::chrono::steady_clock::now();
        work();
        values_.push_back(Microseconds(std::chrono::steady_clock::now() - start).count());
    }
    double quantile(double q) {
        std::sort(values_.begin(), values_.end());
        return values_[static_cast<std::size_t>(q * static_cast<double>(values_.size() - 1))];
    }

private:
    std::vector<double> values_;
};

/// Touched memory in small pages, as a large process has it.
class Heap {
public:
    explicit Heap(std::size_t bytes) : bytes_(bytes) {
        if (bytes == 0) return;
        memory_ =
            ::mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
        if (memory_ == MAP_FAILED) throw std::bad_alloc();
        ::madvise(memory_, bytes, MADV_NOHUGEPAGE);
        for (std::size_t at = 0; at < bytes; at += 4096)
            static_cast<char*>(memory_)[at] = 1;
    }
    ~Heap() {
        if (bytes_ != 0) ::munmap(memory_, bytes_);
    }
    Heap(const Heap&) = delete;
    Heap& operator=(const Heap&) = delete;

private:
    std::size_t bytes_;
    void* memory_ = nullptr;
};

using Peer = void (*)(const char* program);

/// Both take turns, and turns to be the first.
void compare(benchmark::State& state, const char* program, Peer peer, std::size_t heapBytes) {
    const Heap heap(heapBytes);
    const ZAV::String command(program);
    Samples own, others;
    const auto runOwn = [&] { own.time([&] { runCommand(command); }); };
    const auto runPeer = [&] { others.time([&] { peer(program); }); };
    bool ownFirst = true;
    for (auto _ : state) {
        if (ownFirst) runOwn();
        runPeer();
        if (!ownFirst) runOwn();
        ownFirst = !ownFirst;
    }
    state.counters["run"] = own.quantile(0.5);
    state.counters["ratio"] = own.quantile(0.5) / others.quantile(0.5);
    state.counters["p99_ratio"] = own.quantile(0.99) / others.quantile(0.99);
}

void add(const std::string& name, const char* program, Peer peer, std::size_t heapBytes,
         benchmark::IterationCount turns) {
    benchmark::RegisterBenchmark(
        name.c_str(), [=](benchmark::State& state) { compare(state, program, peer, heapBytes); })
        ->Iterations(turns)
        ->Unit(benchmark::kMillisecond);
}

}  // namespace

int main(int argc, char** argv) {
    ::unsetenv("KBB_RAS1");
    benchmark::Initialize(&argc, argv);
    const TemporaryFile script("#!/bin/sh\necho one line\n");
    constexpr std::size_t kGiB = std::size_t{1} << 30;
    add("spawn/small", script.path(), runWithSpawn, 0, 1000);
    add("spawn/1GiB", script.path(), runWithSpawn, kGiB, 200);
    add("fork/small", script.path(), runWithFork, 0, 500);
    add("fork/1GiB", script.path(), runWithFork, kGiB, 50);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
