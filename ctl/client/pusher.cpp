#include "ctl/client/pusher.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

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

bool wasTaken(const PushedFile& file) {
    return file.worst.fault == 0 && file.worst.status == 0;
}

std::string statusText(const TransferAnswer& answer) {
    if (answer.fault != 0) return rpc::faultText(answer.fault);
    switch (answer.status) {
        case 0:
            return "done";
        case 1:
            return "the host has no usable depot directory";
        case 3:
            return "the name is too long";
        case 4:
            return "the host could not open the file";
        case 5:
            return "the host could not write the file";
        case 6:
            return "the host could not make the file's directory";
        default:
            return "the host answered with status " + std::to_string(answer.status);
    }
}

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
        awaitAnswers(first && length == kFull ? 0 : kMostOnTheirWay);
        if (file.worst.fault != 0 || file.worst.status != 0) break;
        first = false;
    } while (length == kFull);
}

void Pusher::awaitAnswers(std::size_t remaining) {
    while (onTheirWay_.size() > remaining) {
        const TransferAnswer answer = client_.receive();
        const Sent sent = onTheirWay_.front();
        onTheirWay_.pop_front();
        const bool taken = answer.fault == 0 && answer.status == 0;
        PushedFile& file = *sent.file;
        if (taken) {
            file.sent += sent.length;
        } else if (file.worst.fault == 0 && file.worst.status == 0) {
            file.worst = answer;
        }
        progress_.add(sent.length);
    }
}

}  // namespace ctl
