#include "ctl/client/transfer/pusher.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "ctl/client/failure.h"

namespace ctl {
namespace {

class OpenFile {
public:
    explicit OpenFile(const std::string& path)
        : descriptor_(::open(path.c_str(), O_RDONLY | O_CLOEXEC)) {
        if (descriptor_ == -1) {
            throw Failure(kWrongUsage, "cannot open " + path + ": " + std::strerror(errno));
        }
    }
    ~OpenFile() { ::close(descriptor_); }
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;
    int get() const { return descriptor_; }

private:
    int descriptor_;
};

}  // namespace

Pusher::Pusher(const HostAddress& host, OnAnswer onAnswer)
    : host_(host), onAnswer_(std::move(onAnswer)) {
    lanes_.emplace_back(host_);
}

void Pusher::push(PushedFile& file) {
    try {
        sendBatches(file);
    } catch (const Failure& failure) {
        // The host is well: what was to be sent before this file shall arrive.
        if (failure.status() == kWrongUsage) finish();
        throw;
    }
}

void Pusher::sendBatches(PushedFile& file) {
    const OpenFile input(file.source);
    Lane& lane = laneFor(file);
    bool first = true;
    std::uintmax_t expected = file.size;
    std::size_t length = 0;
    do {
        length = batch_.read(input.get(), file.source, expected);
        expected -= std::min<std::uintmax_t>(expected, length);
        if (length == 0 && !first) break;
        lane.client.send(file.name, first, batch_);
        lane.onTheirWay.push_back({&file, length});
        // A file whose beginning was refused must not be appended to.
        awaitAnswers(lane, first && length == ChunkBatch::kMostData ? 0 : kMostOnTheirWay);
        if (!file.wasTaken()) break;
        first = false;
    } while (length == ChunkBatch::kMostData);
}

void Pusher::finish() {
    for (Lane& lane : lanes_)
        awaitAnswers(lane, 0);
}

/// The lanes take turns with small files; the batches of a large one must stay in order.
Pusher::Lane& Pusher::laneFor(const PushedFile& file) {
    if (file.size >= ChunkBatch::kMostData) return lanes_.front();
    Lane& lane = lanes_[turn_ % lanes_.size()];
    if (++turn_ == 2) openSecondLane();
    return lane;
}

/// A host that serves as many clients as it can closes further connections; one lane will do.
void Pusher::openSecondLane() {
    try {
        lanes_.emplace_back(host_);
    } catch (const Failure&) {
    }
}

void Pusher::awaitAnswers(Lane& lane, std::size_t remaining) {
    while (lane.onTheirWay.size() > remaining) {
        const TransferAnswer answer = lane.client.receive();
        const Sent sent = lane.onTheirWay.front();
        lane.onTheirWay.pop_front();
        PushedFile& file = *sent.file;
        if (answer.isSuccess()) {
            file.sent += sent.length;
        } else if (file.wasTaken()) {
            file.worst = answer;
        }
        if (onAnswer_) onAnswer_(sent.length);
    }
}

}  // namespace ctl
