#include "support/fleet/nats_server.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <random>
#include <stdexcept>
#include <utility>

namespace {

// Below what the system gives to outgoing connections, which could take it while the server is
// down.
constexpr int kFirstPort = 12000;
constexpr int kLastPort = 31999;
constexpr int kAttempts = 20;
const char kReady[] = "Server is ready";

int anyPort() {
    std::random_device source;
    return std::uniform_int_distribution(kFirstPort, kLastPort)(source);
}

std::size_t countOf(const std::string& text, const std::string& part) {
    std::size_t count = 0;
    for (std::size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1))
        ++count;
    return count;
}

std::string withDirectory(std::string text, const std::string& directory) {
    const std::string mark = "@DIR@";
    for (std::size_t at = text.find(mark); at != std::string::npos; at = text.find(mark, at)) {
        text.replace(at, mark.size(), directory);
    }
    return text;
}

}  // namespace

NatsServer::NatsServer(std::string configuration) : configuration_(std::move(configuration)) {
    dir_.write("log", "");
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        port_ = anyPort();
        if (run()) return;
        if (log().find("address already in use") == std::string::npos) break;
    }
    throw std::runtime_error("nats-server does not start: " + log());
}

NatsServer::~NatsServer() = default;

std::string NatsServer::url() const {
    return "nats://127.0.0.1:" + std::to_string(port_);
}

bool NatsServer::awaitLog(const std::string& text) const {
    return eventually([&] { return log().find(text) != std::string::npos; });
}

void NatsServer::configure() const {
    dir_.write("server.conf", withDirectory("listen: \"127.0.0.1:" + std::to_string(port_) +
                                                "\"\n"
                                                "jetstream { store_dir: \"@DIR@/js\" }\n"
                                                "log_file: \"@DIR@/log\"\n" +
                                                configuration_ + "\n",
                                            dir_.path()));
}

bool NatsServer::run() {
    configure();
    const std::size_t before = countOf(log(), kReady);
    // It must not outlive a test that is killed.
    server_.emplace(std::vector<std::string>{"/usr/bin/setpriv", "--pdeathsig", "KILL",
                                             "/usr/sbin/nats-server", "-c",
                                             dir_.path("server.conf")});
    const auto ready = [&] { return countOf(log(), kReady) > before; };
    eventually([&] { return ready() || !server_->running(); });
    if (ready()) return true;
    dir_.write("log", log() + server_->err());
    server_.reset();
    return false;
}

void NatsServer::end(int signal) {
    server_->signal(signal);
    server_->wait();
    server_.reset();
}

void NatsServer::stop() {
    end(SIGTERM);
}

void NatsServer::kill() {
    end(SIGKILL);
}

void NatsServer::pause() {
    server_->signal(SIGSTOP);
    // Its threads stop one after the other; the last one tells.
    siginfo_t stopped{};
    ::waitid(P_PID, static_cast<id_t>(server_->pid()), &stopped, WSTOPPED | WNOWAIT);
}

void NatsServer::goOn() {
    server_->signal(SIGCONT);
}

void NatsServer::start() {
    if (!run()) throw std::runtime_error("nats-server does not start again: " + log());
}

void NatsServer::reload(const std::string& configuration) {
    const std::string reloaded = "Reloaded server configuration";
    const std::size_t before = countOf(log(), reloaded);
    configuration_ = configuration;
    configure();
    server_->signal(SIGHUP);
    if (!eventually([&] { return countOf(log(), reloaded) > before; })) {
        throw std::runtime_error("nats-server does not reload: " + log());
    }
}
