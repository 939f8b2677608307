#include "host/depot/transfer_gate.h"

#include <algorithm>
#include <utility>

#include "host/depot/real_path.h"
#include "host/depot/transfer_call.h"
#include "platform/ras1.h"

namespace host {
namespace {

RAS1_UNIT traceUnit{"zavhost"};

void traceRefusal(const char* function, int line, const std::string& name,
                  const Objection& objection) {
    if ((RAS1_Flags(traceUnit) & RAS1_ERROR) == 0) return;
    const RAS1_BLOCK block{&traceUnit, function};
    RAS1_Printf(&block, RAS1_ERROR, line, "Transfer of [%s] is refused: %s", name.c_str(),
                objection.reason.c_str());
}

Objection beingSent() {
    return {"depot-transfers", "another client is just sending this file",
            "Wait until it has ended, and push again."};
}

}  // namespace

std::optional<std::string> TransferGate::before(const ncs::Call& call) {
    if (!isTransfer(call)) return std::nullopt;
    const std::optional<TransferCall> transfer = readTransferCall(call);
    if (!transfer) return std::nullopt;
    std::string destination = rules_.destination(transfer->name);
    std::optional<Objection> objection =
        rules_.objectionTo(transfer->name, destination, transfer->startsFile);
    if (!objection && rules_.guarded()) {
        objection = begin(call.association, {std::move(destination), transfer->endsFile});
    }
    if (!objection) return std::nullopt;
    traceRefusal(__func__, __LINE__, transfer->name, *objection);
    return transferReply(kTransferRefused);
}

std::optional<Objection> TransferGate::begin(std::uint64_t association, Transfer transfer) {
    const embedded::MutexLock lock(lock_);
    if (isSentByOther(association, transfer.destination)) return beingSent();
    underWay_[association] = std::move(transfer);
    return std::nullopt;
}

/// There are at most as many as the server has connections.
bool TransferGate::isSentByOther(std::uint64_t association, const std::string& destination) const {
    return std::any_of(underWay_.begin(), underWay_.end(), [&](const auto& entry) {
        return entry.first != association && entry.second.destination == destination;
    });
}

void TransferGate::after(const ncs::Call& call, const std::string& reply) noexcept {
    const embedded::MutexLock lock(lock_);
    const auto found = underWay_.find(call.association);
    if (found == underWay_.end()) return;
    if (found->second.endsFile || statusOfReply(reply) != 0) underWay_.erase(found);
}

void TransferGate::ended(std::uint64_t association) noexcept {
    const embedded::MutexLock lock(lock_);
    underWay_.erase(association);
}

std::optional<Objection> TransferGate::objectionTo(const std::string& name) const {
    if (auto objection = rules_.objectionTo(name, rules_.destination(name), true)) {
        return objection;
    }
    if (rules_.guarded() && isReceiving(name)) return beingSent();
    return std::nullopt;
}

bool TransferGate::isReceiving(const std::string& name) const {
    const std::string destination = rules_.destination(name);
    const embedded::MutexLock lock(lock_);
    return std::any_of(underWay_.begin(), underWay_.end(), [&](const auto& entry) {
        return isWithin(entry.second.destination, destination);
    });
}

}  // namespace host
