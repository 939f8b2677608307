#include "ctl/client/transfer/pusher.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/client/transfer/checksum.h"
#include "ctl/client/transfer/interruption.h"

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

/// The checksum of what the depot shall hold of a file.
class FileSum {
public:
    explicit FileSum(PushedFile& file) : file_(file) {}

    void add(const ChunkBatch& batch) {
        batch.eachPiece([this](const unsigned char* data, std::size_t length) {
            if (file_.converted) {
                addConverted(data, length);
            } else {
                addPlain(data, length);
            }
        });
    }
    void finish() { file_.sha256 = sum_.finish(); }

private:
    void addPlain(const unsigned char* data, std::size_t length) {
        sum_.add(data, length);
        file_.kept += length;
    }
    void addConverted(const unsigned char* data, std::size_t length) {
        converted_.clear();
        std::copy_if(data, data + length, std::back_inserter(converted_),
                     [](unsigned char c) { return c != '\r' && c != 26; });
        addPlain(converted_.data(), converted_.size());
    }

    PushedFile& file_;
    Checksum sum_;
    std::vector<unsigned char> converted_;
};

}  // namespace

Pusher::Pusher(const HostAddress& host, OnAnswer onAnswer, Sums sums)
    : host_(host), onAnswer_(std::move(onAnswer)), sums_(sums) {
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
    FileSum sum(file);
    do {
        length = batch_.read(input.get(), file.source, expected);
        expected -= std::min<std::uintmax_t>(expected, length);
        if (length == 0 && !first) break;
        sendBatch(lane, file, first, length);
        if (sums_ == Sums::Yes) sum.add(batch_);
        // A file whose beginning was refused must not be appended to.
        awaitAnswers(lane, first && length == ChunkBatch::kMostData ? 0 : kMostOnTheirWay);
        if (!file.wasTaken()) return;
        first = false;
    } while (length == ChunkBatch::kMostData);
    file.isSent = true;
    if (sums_ == Sums::Yes) sum.finish();
}

void Pusher::sendBatch(Lane& lane, PushedFile& file, bool first, std::size_t length) {
    if (Interruption::signal() != 0) throw Failure(kNoHost, "interrupted");
    lane.onTheirWay.push_back({&file, length});
    ++file.unanswered;
    lane.client.send(file.name, first, batch_);
}

void Pusher::finish() {
    for (Lane& lane : lanes_)
        awaitAnswers(lane, 0);
}

void Pusher::abandon() noexcept {
    for (Lane& lane : lanes_) {
        try {
            lane.client.stopSending(std::chrono::seconds(2));
            awaitAnswers(lane, 0);
            lane.client.receive();
        } catch (...) {  // the host has closed the connection, and knows that the sending is over
        }
    }
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
        --file.unanswered;
        if (answer.isSuccess()) {
            ++file.taken;
            file.sent += sent.length;
        } else if (file.wasTaken()) {
            file.worst = answer;
        }
        if (onAnswer_) onAnswer_(sent.length);
    }
}

}  // namespace ctl
