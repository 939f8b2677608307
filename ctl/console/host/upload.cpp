#include "ctl/console/host/upload.h"

#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>
#include <string_view>
#include <utility>

#include "ctl/client/transfer/push.h"
#include "ctl/console/received_file.h"
#include "ctl/console/refusals.h"
#include "ctl/verbs/depot/push_page.h"
#include "http/url.h"

namespace console {

/// Held while a file is on its way. The uploads outlive it.
class UploadPlace {
public:
    UploadPlace(Uploads& uploads, std::string name, std::string place)
        : uploads_(uploads), name_(std::move(name)), place_(std::move(place)) {}
    ~UploadPlace() { uploads_.leave(place_); }
    UploadPlace(const UploadPlace&) = delete;
    UploadPlace& operator=(const UploadPlace&) = delete;
    const std::string& name() const { return name_; }

private:
    Uploads& uploads_;
    const std::string name_;
    const std::string place_;  ///< the same for each way of writing the name
};

namespace {

using nlohmann::json;

/// Each may fill as much of the disk as the largest file does.
constexpr std::size_t kMostUploads = 4;

http::Reply refusalOf(const ctl::PushedFile& file, bool isRefused) {
    const std::string text = ctl::meaningOf(file, isRefused);
    if (file.guard.empty() && file.hint.empty()) return http::errorReply(409, text);
    json document = {{"error", text}};
    if (!file.guard.empty()) document["guard"] = file.guard;
    if (!file.hint.empty()) document["hint"] = file.hint;
    return http::jsonReply(409, document.dump(-1, ' ', false, json::error_handler_t::replace));
}

/// Why a push that went well is not verified; empty if it is.
std::string whyNotVerified(const ctl::PushReport& report) {
    switch (report.verification) {
        case ctl::Verification::NotOffered:
            return "not verified: the host cannot compute checksums";
        case ctl::Verification::None:
            return "not verified: the host's guards are off";
        default:
            return "";
    }
}

http::Reply replyTo(const ctl::PushReport& report) {
    const ctl::PushedFile& file = report.files.front();
    if (report.refused || !ctl::hasArrived(file)) return refusalOf(file, report.refused);
    if (report.verification == ctl::Verification::Unknown) {
        return http::errorReply(502, "not verified: " + report.whyUnknown);
    }
    json notes = report.notes;
    const std::string reason = whyNotVerified(report);
    if (!reason.empty()) notes.push_back(reason);
    const json document = {{"path", file.name},
                           {"bytes", file.sent},
                           {"sha256", file.sha256},
                           {"verified", reason.empty()},
                           {"notes", notes}};
    return http::jsonReply(200, document.dump(-1, ' ', false, json::error_handler_t::replace));
}

/// One file: first into a file here, then to the host.
class Upload final : public http::BodyTaker {
public:
    Upload(std::unique_ptr<UploadPlace> place, std::string directory, ctl::HostAddress host)
        : place_(std::move(place)), file_(std::move(directory)), host_(std::move(host)) {}

    std::uint64_t mostBytes() const override { return kLargestUpload; }

    std::optional<http::Reply> take(std::string_view piece) override {
        auto refusal = file_.take(piece);
        if (refusal) place_.reset();
        return refusal;
    }

    http::Answer answer() override {
        if (auto refusal = take({})) return std::move(*refusal);  // an empty file has no piece
        http::Answer answer = push();
        place_.reset();  // whoever has the answer may send the next file of this name
        return answer;
    }

private:
    http::Reply push() const {
        ctl::PushedFile file;
        file.source = "/proc/self/fd/" + std::to_string(file_.descriptor().get());
        file.name = place_->name();
        file.size = file_.size();
        ctl::PushPlan plan;
        plan.files.push_back(std::move(file));
        ctl::PushOptions options;
        options.wantsSums = true;
        try {
            return replyTo(ctl::pushToDepot(host_, std::move(plan), options));
        } catch (const ctl::Failure& failure) {
            return console::replyTo(failure);
        }
    }

    std::unique_ptr<UploadPlace> place_;
    ReceivedFile file_;
    const ctl::HostAddress host_;
};

/// The place in the depot that the request names; nothing if it is not one.
std::optional<std::string> nameIn(const http::Request& head) {
    const auto target = http::parseTarget(head.target);
    if (!target || target->parameters.size() != 1 || target->parameters.front().first != "path") {
        return std::nullopt;
    }
    std::string name = target->parameters.front().second;
    if (name.empty() || name.back() == '/') return std::nullopt;
    return name;
}

}  // namespace

http::BodyPlan Uploads::begin(const http::Request& head, const ctl::HostAddress& host) {
    const auto name = nameIn(head);
    if (!name) return http::errorReply(400, "path names the file in the depot");
    // It separates components on the wire, so that the name would arrive as another.
    if (name->find('\\') != std::string::npos) {
        return http::errorReply(400, "a name with a backslash cannot be pushed: " + *name);
    }
    // Two names of one file are one: both would be written at a time.
    const std::string place = std::filesystem::path(*name).lexically_normal().string();
    const std::string reason = enter(place);
    if (!reason.empty()) return http::errorReply(429, reason);
    return std::make_unique<Upload>(std::make_unique<UploadPlace>(*this, *name, place), directory_,
                                    host);
}

bool Uploads::empty() const {
    const embedded::MutexLock lock(lock_);
    return names_.empty();
}

std::string Uploads::enter(const std::string& name) {
    const embedded::MutexLock lock(lock_);
    if (names_.count(name) > 0) return "a file of this name is on its way already";
    if (names_.size() >= kMostUploads) return "as many files as can be are on their way already";
    names_.insert(name);
    return "";
}

void Uploads::leave(const std::string& name) {
    const embedded::MutexLock lock(lock_);
    names_.erase(name);
}

}  // namespace console
