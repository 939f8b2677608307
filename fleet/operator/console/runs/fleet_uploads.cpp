#include "fleet/operator/console/runs/fleet_uploads.h"

#include <exception>
#include <optional>
#include <string_view>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/console/received_file.h"
#include "ctl/console/refusals.h"
#include "http/url.h"

namespace fleet {
namespace {

/// Each may fill as much of the disk as the largest file does.
constexpr int kMostUploads = 2;

/// The only parameters of a request's target.
struct UploadTarget {
    std::string path;
    std::string on;
};

UploadTarget uploadTargetIn(const http::Request& head) {
    const auto target = http::parseTarget(head.target);
    UploadTarget found;
    bool isWrong = !target || target->parameters.size() != 2;
    if (!isWrong) {
        for (const auto& [name, value] : target->parameters) {
            std::string* const place =
                name == "path" ? &found.path : (name == "on" ? &found.on : nullptr);
            isWrong = isWrong || place == nullptr || !place->empty();
            if (place != nullptr) *place = value;
        }
    }
    if (!isWrong) return found;
    throw ctl::Failure(ctl::kWrongUsage,
                       "path names the file in the depots, and on selects the hosts");
}

}  // namespace

/// One file. The uploads outlive it.
class FleetUploads::Upload final : public http::BodyTaker {
public:
    Upload(FleetUploads& uploads, RunRequest request)
        : uploads_(uploads),
          request_(std::move(request)),
          file_(std::make_shared<console::ReceivedFile>(uploads.directory_)) {
        ++uploads_.count_;
    }
    ~Upload() override { --uploads_.count_; }
    Upload(const Upload&) = delete;
    Upload& operator=(const Upload&) = delete;

    std::uint64_t mostBytes() const override { return console::kLargestUpload; }
    std::optional<http::Reply> take(std::string_view piece) override { return file_->take(piece); }
    http::Answer answer() override {
        if (auto refusal = take({})) return std::move(*refusal);  // an empty file has no piece
        request_.file = std::move(file_);
        return uploads_.push_(std::move(request_));
    }

private:
    FleetUploads& uploads_;
    RunRequest request_;
    std::shared_ptr<console::ReceivedFile> file_;
};

FleetUploads::FleetUploads(std::string directory, std::string url, Push push)
    : directory_(std::move(directory)), url_(std::move(url)), push_(std::move(push)) {}

http::BodyPlan FleetUploads::begin(const http::Request& head) {
    try {
        const UploadTarget target = uploadTargetIn(head);
        RunRequest request = pushRequest(target.path, target.on, url_);
        if (count_ >= kMostUploads) {
            return http::errorReply(429, "as many files as can be are on their way already");
        }
        return std::make_unique<Upload>(*this, std::move(request));
    } catch (const ctl::Failure& failure) {
        return console::replyTo(failure);
    }
}

}  // namespace fleet
