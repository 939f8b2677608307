#include "soak/host_process.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <stdexcept>
#include <thread>
#include <vector>

namespace soak {
namespace {

constexpr std::chrono::milliseconds kPause{10};
constexpr int kReadyPauses = 6000;

int logFile(const std::string& path) {
    return ::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
}

[[noreturn]] void become(const std::string& program, const std::string& plugin,
                         const SoakHome& home) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    ::dup2(::open("/dev/null", O_RDONLY | O_CLOEXEC), STDIN_FILENO);
    ::dup2(logFile(home.log("host.out")), STDOUT_FILENO);
    ::dup2(logFile(home.log("host.err")), STDERR_FILENO);
    ::setenv("TMPDIR", home.temporary().c_str(), 1);
    ::setenv("TIMEOUT", std::to_string(kChildSeconds).c_str(), 1);
    ::setenv("QVSDEPLOY_AGENTDEPOT", home.depot().c_str(), 1);
    ::setenv("KBB_RAS1_LOG", home.log("host.trace").c_str(), 1);
    for (const char* name : {"KBB_RAS1", "QVS_BINARCH", "ZAV_SOCKET", "TOVRINHOME"})
        ::unsetenv(name);
    const std::string homePath = home.home();
    const std::string socket = home.socket();
    std::vector<const char*> argv = {program.c_str(), "--home",        homePath.c_str(), "--socket",
                                     socket.c_str(),  "--origin-node", "soaked"};
    // The plug-in itself is soaked: guards would keep most of the odd requests from it.
    argv.push_back("--unguarded");
    if (!plugin.empty()) argv.insert(argv.end(), {"--plugin", plugin.c_str()});
    argv.push_back(nullptr);
    ::execv(program.c_str(), const_cast<char* const*>(argv.data()));
    ::_exit(127);
}

}  // namespace

HostProcess::HostProcess(const std::string& program, const std::string& plugin,
                         const SoakHome& home)
    : program_(program), plugin_(plugin), home_(home) {
    start();
}

void HostProcess::start() {
    std::filesystem::remove(home_.log("host.out"));  // an earlier one was ready, too
    ended_ = false;
    pid_ = ::fork();
    if (pid_ == -1) throw std::runtime_error("cannot start a process");
    if (pid_ == 0) become(program_, plugin_, home_);
    for (int i = 0; i < kReadyPauses && running(); ++i) {
        if (contentOf(home_.log("host.out")).find("ready: ") != std::string::npos) return;
        std::this_thread::sleep_for(kPause);
    }
    throw std::runtime_error("the host is not ready: " + contentOf(home_.log("host.err")));
}

HostProcess::~HostProcess() {
    kill();
}

void HostProcess::kill() {
    if (!running()) return;
    ::kill(pid_, SIGKILL);
    ::waitpid(pid_, nullptr, 0);
    ended_ = true;
}

bool HostProcess::running() {
    if (ended_ || pid_ <= 0) return false;
    int status = 0;
    const pid_t result = ::waitpid(pid_, &status, WNOHANG);
    if (result != pid_) return true;
    ended_ = true;
    status_ = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
    return false;
}

void HostProcess::stop() const {
    if (!ended_) ::kill(pid_, SIGSTOP);
}

void HostProcess::resume() const {
    if (!ended_) ::kill(pid_, SIGCONT);
}

int HostProcess::end(double seconds) {
    if (running()) {
        resume();
        ::kill(pid_, SIGTERM);
    }
    const auto limit = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
    while (running()) {
        if (std::chrono::steady_clock::now() >= limit) {
            kill();
            return -1;
        }
        std::this_thread::sleep_for(kPause);
    }
    return status_;
}

}  // namespace soak
