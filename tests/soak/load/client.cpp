#include "soak/load/client.h"

#include <poll.h>

#include <algorithm>
#include <utility>

namespace soak {
namespace {

constexpr int kTurnMilliseconds = 10;
constexpr double kRetrySeconds = 0.1;
/// How often all are asked whether they have come to their end, when they are to.
constexpr double kNudgeSeconds = 0.3;

}  // namespace

bool Client::step(bool readable, bool writable) {
    if (connection_.isOpen()) return proceed(readable, writable);
    switch (connection_.open(path_)) {
        case Connection::Opening::Done:
            return begin();
        case Connection::Opening::Later:
            world_.tally.count("waits for a connection");
            wakeIn(kRetrySeconds);
            return true;
        case Connection::Opening::Refused:
            break;
    }
    world_.tally.fault("no connection to " + path_);
    notConnected();
    return false;
}

void Crowd::add(std::unique_ptr<Client> client) {
    ++kinds_[client->kind()];
    clients_.push_back(std::move(client));
}

void Crowd::loseHost() {
    world_.hostIsDead = true;
    for (const auto& client : clients_) {
        if (client->descriptor() >= 0 && client->step(true, false)) client->hostDied();
    }
    world_.hostIsDead = false;
}

void Crowd::clear() {
    clients_.clear();
    kinds_.clear();
    world_.joining.clear();
}

std::size_t Crowd::count(const std::string& kind) const {
    const auto found = kinds_.find(kind);
    return found == kinds_.end() ? 0 : found->second;
}

void Crowd::turn() {
    std::vector<pollfd> waiting;
    waiting.reserve(clients_.size());
    for (const auto& client : clients_) {
        const int events =
            (client->wantsToRead() ? POLLIN : 0) | (client->wantsToWrite() ? POLLOUT : 0);
        // Without an interest a hang-up would wake at once and for ever.
        waiting.push_back({events == 0 ? -1 : client->descriptor(), static_cast<short>(events), 0});
    }
    ::poll(waiting.data(), waiting.size(), kTurnMilliseconds);
    const double now = world_.clock.now();
    const bool everybody = world_.draining && now >= nextNudge_;
    if (everybody) nextNudge_ = now + kNudgeSeconds;
    for (std::size_t i = 0; i < clients_.size(); ++i) {
        std::unique_ptr<Client>& client = clients_[i];
        const bool readable = (waiting[i].revents & (POLLIN | POLLHUP | POLLERR)) != 0;
        const bool writable = (waiting[i].revents & POLLOUT) != 0;
        if (!readable && !writable && !everybody && client->wakeAt() > now) continue;
        if (!client->step(readable, writable)) {
            --kinds_[client->kind()];
            client.reset();
        }
    }
    clients_.erase(std::remove(clients_.begin(), clients_.end(), nullptr), clients_.end());
    for (auto& client : std::exchange(world_.joining, {}))
        add(std::move(client));
}

}  // namespace soak
