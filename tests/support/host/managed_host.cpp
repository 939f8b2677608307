#include "support/host/managed_host.h"

#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace fs = std::filesystem;

namespace {

/// A line's number in /proc/PID/status, such as "Threads:".
long statusFigure(pid_t pid, const std::string& name) {
    std::ifstream in("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(in, line);) {
        if (line.rfind(name, 0) == 0) return std::atol(line.c_str() + name.size());
    }
    return -1;
}

void addMissingPrograms(const std::string& home) {
    fs::create_directories(home + "/bin");
    for (const char* const name : {"TovrinAgent", "cinfo", "uninstall.sh"}) {
        const fs::path path = home + "/bin/" + name;
        if (fs::exists(path)) continue;
        std::ofstream(path) << "#!/bin/sh\nexit 1\n";
        fs::permissions(path, fs::perms::owner_all);
    }
}

}  // namespace

std::string zavhostPath() {
    return ZAV_BUILD_DIR "/bin/zavhost";
}

std::string zavctlPath() {
    return ZAV_BUILD_DIR "/bin/zavctl";
}

ManagedHost::ManagedHost(const std::string& home, const Environment& environment,
                         const std::vector<std::string>& moreArguments, Guards guards)
    : home_(home),
      environment_(environment),
      moreArguments_(moreArguments),
      socket_(scratch_.path("host.sock")) {
    if (guards == Guards::Off) {
        moreArguments_.emplace_back("--unguarded");
    } else {
        addMissingPrograms(home_);
    }
    start();
}

ManagedHost::~ManagedHost() {
    if (program_) stop();
}

void ManagedHost::start() {
    std::vector<std::string> argv = {zavhostPath(), "--home", home_, "--socket", socket_};
    argv.insert(argv.end(), moreArguments_.begin(), moreArguments_.end());
    Environment environment = environment_;
    const bool saysWhere = std::any_of(environment.begin(), environment.end(),
                                       [](const auto& one) { return one.first == "KBB_RAS1_LOG"; });
    if (!saysWhere) environment.emplace_back("KBB_RAS1_LOG", scratch_.path("trace.log"));
    program_ = std::make_unique<Program>(argv, "", environment);
    if (!program_->awaitOutput("ready: " + socket_, std::chrono::minutes(3))) {
        throw std::runtime_error("the host is not ready: " + program_->wait().err);
    }
}

ProgramResult ManagedHost::stop() {
    program_->signal(SIGTERM);
    ProgramResult result = program_->wait(std::chrono::seconds(30));
    program_.reset();
    return result;
}

ProgramResult ManagedHost::zavctl(const std::vector<std::string>& arguments,
                                  const std::string& input, const Environment& environment) const {
    std::vector<std::string> argv = {zavctlPath(), "--socket", socket_};
    argv.insert(argv.end(), arguments.begin(), arguments.end());
    return runProgram(argv, input, environment);
}

std::unique_ptr<Program> ManagedHost::startZavctl(const std::vector<std::string>& arguments) const {
    std::vector<std::string> argv = {zavctlPath(), "--socket", socket_, "--json"};
    argv.insert(argv.end(), arguments.begin(), arguments.end());
    return std::make_unique<Program>(argv);
}

int ManagedHost::connect() const {
    const int descriptor = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, socket_.c_str(), sizeof address.sun_path - 1);
    if (::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        ::close(descriptor);
        throw std::runtime_error("cannot connect to the host");
    }
    return descriptor;
}

std::string ManagedHost::exchange(const std::string& bytes, std::chrono::milliseconds quiet) const {
    const int descriptor = connect();
    std::size_t sent = 0;
    while (sent < bytes.size()) {
        const ssize_t written =
            ::send(descriptor, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
        if (written <= 0) break;  // an early answer is still to be read
        sent += static_cast<std::size_t>(written);
    }
    std::string answer;
    char piece[4096];
    for (;;) {
        pollfd ready{descriptor, POLLIN, 0};
        if (::poll(&ready, 1, static_cast<int>(quiet.count())) <= 0) break;
        const ssize_t length = ::recv(descriptor, piece, sizeof piece, 0);
        if (length <= 0) break;
        answer.append(piece, static_cast<std::size_t>(length));
    }
    ::close(descriptor);
    return answer;
}

int ManagedHost::openDescriptors() const {
    const fs::directory_iterator entries("/proc/" + std::to_string(pid()) + "/fd");
    return static_cast<int>(std::distance(begin(entries), end(entries)));
}

int ManagedHost::threads() const {
    return static_cast<int>(statusFigure(pid(), "Threads:"));
}

int ManagedHost::children() const {
    int count = 0;
    for (const auto& task : fs::directory_iterator("/proc/" + std::to_string(pid()) + "/task")) {
        std::ifstream in(task.path() / "children");
        for (std::string child; in >> child;)
            ++count;
    }
    return count;
}

long ManagedHost::residentKiB() const {
    return statusFigure(pid(), "VmRSS:");
}
