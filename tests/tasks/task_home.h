/// A scratch home and depot for one test, with programs that record how they were called.
#pragma once

#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "base/zavstr.h"
#include "support/scratch_dir.h"
#include "tasks/home.h"
#include "tasks/zavtasks.h"
#include "tasks/zavtqelm.h"

inline std::string narrow(const ZAV::String& text) {
    return std::string(static_cast<const char*>(text.c_str()));
}

/// The result in a task's reply.
struct Outcome {
    int rc;
    std::string messageId;
    std::string parameter;

    bool operator==(const Outcome& other) const {
        return rc == other.rc && messageId == other.messageId && parameter == other.parameter;
    }
    friend std::ostream& operator<<(std::ostream& out, const Outcome& outcome) {
        return out << outcome.rc << " [" << outcome.messageId << "] [" << outcome.parameter << "]";
    }
};

inline std::string unpadded(const char* field, std::size_t size) {
    std::string text(field, size);
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

inline Outcome outcomeOf(TaskQueueElem& task, int rc) {
    task.ReturnStatus(rc);
    const zav_kagreqt_data_t row = task.getReturnResults();
    return {row.retval, unpadded(row.retmsgid, sizeof row.retmsgid),
            unpadded(row.retmsgparm, sizeof row.retmsgparm)};
}

inline const Outcome kSuccess{0, "", ""};

/// The number of open descriptors of this process.
inline std::ptrdiff_t openDescriptors() {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
}

/// Sets an environment variable while it exists.
class ScopedEnv {
public:
    ScopedEnv(const char* name, const char* value) : name_(name) {
        if (value != nullptr) {
            ::setenv(name, value, 1);
        } else {
            ::unsetenv(name);
        }
    }
    ~ScopedEnv() { ::unsetenv(name_); }
    ScopedEnv(const ScopedEnv&) = delete;
    ScopedEnv& operator=(const ScopedEnv&) = delete;

private:
    const char* name_;
};

class TaskHome {
public:
    TaskHome()
        : home_(dir_.makeDir("home")),
          depot_(dir_.makeDir("depot") + "/"),
          savedHome_(std::exchange(ZAV_TOVRINHOME, home_.c_str())),
          savedDepot_(depotDir) {
        depotDir = depot_.c_str();
    }
    ~TaskHome() {
        ZAV_TOVRINHOME = savedHome_;
        depotDir = savedDepot_;
    }
    TaskHome(const TaskHome&) = delete;
    TaskHome& operator=(const TaskHome&) = delete;

    const std::string& home() const { return home_; }
    /// With a "/" at its end.
    const std::string& depot() const { return depot_; }
    const ScratchDir& dir() const { return dir_; }

    /// Creates a program in the home that records its arguments, its standard input and the
    /// settings for consoles, and then runs `body`. Returns its path.
    std::string program(const std::string& relative, const std::string& body) const {
        return dir_.script("home/" + relative,
                           "{ printf '[%s]' \"$@\"; echo; } >> \"$0.calls\"\n"
                           "cat >> \"$0.input\"\n"
                           "env | grep '^KUM' > \"$0.env\"\n" +
                               body + "\n");
    }
    /// A file in the home that can be executed as little as it can be run.
    std::string notExecutable(const std::string& relative) const {
        return dir_.write("home/" + relative, "#!/bin/sh\n", 0644);
    }

    /// The calls of a program, each as a text such as "[-p][ux]".
    std::vector<std::string> calls(const std::string& relative) const {
        std::vector<std::string> found;
        std::istringstream in(dir_.read("home/" + relative + ".calls"));
        for (std::string line; std::getline(in, line);)
            found.push_back(line);
        return found;
    }
    /// Everything that all calls of a program have read from standard input.
    std::string input(const std::string& relative) const {
        return dir_.read("home/" + relative + ".input");
    }
    /// The settings passed to the last call of a program.
    std::vector<std::string> environment(const std::string& relative) const {
        std::vector<std::string> found;
        std::istringstream in(dir_.read("home/" + relative + ".env"));
        for (std::string line; std::getline(in, line);)
            found.push_back(line);
        return found;
    }

    /// Creates an inventory program that prints `list` for "-d" and `report` for "-p".
    void inventory(const std::string& list, const std::string& report = "") const {
        dir_.write("home/list.txt", list);
        dir_.write("home/report.txt", report);
        program("bin/cinfo", "case $1 in\n-d) cat " + home_ + "/list.txt;;\n-p) cat " + home_ +
                                 "/report.txt;;\nesac");
    }
    static std::string listHeader() {
        return "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
    }
    static std::string listLine(const std::string& product, const std::string& platform) {
        return "\"" + product + "\",\"A product\",\"" + platform + "\",\"06010000\",\"100\"\n";
    }

    static constexpr const char* kTranslator = "agtqvs6/li6263/bin/zav_xa";

    /// Creates an inventory with the shared component, and a translator in that. Returns the
    /// translator's path.
    std::string translator(const std::string& body) const {
        inventory(listHeader() + listLine("lz", "li6263") + listLine("ax", "li6263") +
                  listLine("ux", "li6263"));
        return program(kTranslator, body);
    }

private:
    ScratchDir dir_;
    std::string home_;
    std::string depot_;
    const char* savedHome_;
    ZAV::String savedDepot_;
};
