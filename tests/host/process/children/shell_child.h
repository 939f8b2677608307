/// Children of a test, as commands of the plug-in are of a host.
#pragma once

#include <gtest/gtest.h>
#include <spawn.h>
#include <unistd.h>

#include <string>
#include <thread>

#include "host/process/children/process_table.h"

/// The child of a shell command, started on the calling thread.
inline pid_t startShell(const std::string& body) {
    std::string shell = "/bin/sh";
    std::string option = "-c";
    std::string text = body;
    char* const argv[] = {shell.data(), option.data(), text.data(), nullptr};
    pid_t pid = -1;
    EXPECT_EQ(::posix_spawn(&pid, argv[0], nullptr, nullptr, argv, environ), 0);
    return pid;
}

/// Whether it runs: neither gone nor a zombie.
inline bool lives(pid_t pid) {
    for (const host::ProcessEntry& process : host::readProcesses()) {
        if (process.pid == pid) return process.isAlive;
    }
    return false;
}

/// Runs on a thread of its own, because commands are never children of the main thread.
template <typename Body>
void onAnotherThread(Body body) {
    std::thread(body).join();
}
