/// Terminals for programs that draw on one.
#pragma once

#include <unistd.h>

#include <string>
#include <vector>

#include "support/host/program.h"
#include "support/scratch_dir.h"

/// A terminal of 80 columns and 24 lines, in which one program runs.
class Terminal {
public:
    /// Whether there is what it takes.
    static bool isThere() { return ::access("/usr/bin/tmux", X_OK) == 0; }

    explicit Terminal(const std::string& command) {
        run({"new-session", "-d", "-x", "80", "-y", "24", command});
    }
    ~Terminal() { run({"kill-server"}); }
    Terminal(const Terminal&) = delete;
    Terminal& operator=(const Terminal&) = delete;

    std::string shown() const { return run({"capture-pane", "-p"}).out; }
    /// Waits until it shows the text; false when it did not in time.
    bool comesToShow(const std::string& text) const {
        return eventually([&] { return shown().find(text) != std::string::npos; });
    }
    void type(const std::string& key) const { run({"send-keys", key}); }
    bool isOpen() const { return run({"has-session"}).status == 0; }

private:
    ProgramResult run(std::vector<std::string> words) const {
        const std::vector<std::string> tmux = {"/usr/bin/tmux", "-f", "/dev/null", "-S",
                                               scratch_.path("tmux")};
        words.insert(words.begin(), tmux.begin(), tmux.end());
        return runProgram(words, "", {{"LC_ALL", "C.UTF-8"}, {"TERM", "screen"}});
    }

    ScratchDir scratch_;
};
