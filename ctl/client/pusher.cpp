#include "ctl/client/pusher.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "ctl/client/failure.h"

namespace ctl {
namespace {

class OpenFile {
public:
    explicit OpenFile(const std::filesystem::path& path)
        : descriptor_(::open(path.c_str(), O_RDONLY | O_CLOEXEC)) {
        if (descriptor_ == -1) {
            throw Failure(kWrongUsage,
                          "cannot open " + path.string() + ": " + std::strerror(errno));
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
    : client_(host.rpcSocket, host.timeout), onAnswer_(std::move(onAnswer)) {}

void Pusher::push(PushedFile& file) {
    const OpenFile input(file.source);
    bool first = true;
    std::size_t length = 0;
    do {
        length = batch_.read(input.get(), file.source.string());
        if (length == 0 && !first) break;
        client_.send(file.name, first, batch_);
        onTheirWay_.push_back({&file, length});
        // A file whose beginning was refused must not be appended to.
        awaitAnswers(first && length == ChunkBatch::kMostData ? 0 : kMostOnTheirWay);
        if (!file.wasTaken()) break;
        first = false;
    } while (length == ChunkBatch::kMostData);
}

void Pusher::awaitAnswers(std::size_t remaining) {
    while (onTheirWay_.size() > remaining) {
        const TransferAnswer answer = client_.receive();
        const Sent sent = onTheirWay_.front();
        onTheirWay_.pop_front();
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
