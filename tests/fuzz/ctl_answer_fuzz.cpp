// What the control program makes of a host's answers: it reads a document or says what is wrong
// with it, and whatever bytes come in place of an answer, it ends with an error of its own or a
// document. An input is a byte that tells which of the two, and the text.

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <mutex>
#include <nlohmann/json.hpp>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/bounded_json.h"
#include "support/fuzz_support.h"

using fuzz::require;
using nlohmann::json;

namespace {

/// How many lists and objects are around the innermost one.
std::size_t levelsOf(const json& document) {
    std::size_t levels = 0;
    if (!document.is_structured()) return levels;
    for (const json& each : document)
        levels = std::max(levels, levelsOf(each));
    return levels + 1;
}

void checkDocument(const std::string& text) {
    const ctl::ParsedJson parsed = ctl::parseBounded(text);
    const bool isJson = json::accept(text);
    const auto brackets =
        std::count_if(text.begin(), text.end(), [](char c) { return c == '{' || c == '['; });
    const bool isSmall = static_cast<std::size_t>(brackets) <= ctl::kMostLevels;
    if (!isJson) require(parsed.fault != nullptr, "what is no JSON is not read");
    if (isJson && isSmall) require(parsed.fault == nullptr, "small documents are read");
    const json object = ctl::objectIn(text);
    require(object.is_null() || (object.is_object() && object == parsed.document), "objects only");
    if (parsed.fault != nullptr) return require(parsed.document.is_null(), "no half documents");
    require(levelsOf(parsed.document) <= ctl::kMostLevels, "no document is too deep to be shown");
    require(ctl::parseBounded(parsed.document.dump()).fault == nullptr, "what is read can be said");
}

/// A host that gives each client the same bytes, and then nothing more.
class Host {
public:
    Host() : path_("/tmp/zavfuzz-answer-" + std::to_string(::getpid())) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        path_.copy(address.sun_path, sizeof address.sun_path - 1);
        listener_ = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
        ::unlink(path_.c_str());
        require(
            ::bind(listener_, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
                ::listen(listener_, 8) == 0,
            "a socket can be made");
        thread_ = std::thread([this] { serve(); });
    }
    ~Host() {
        ::shutdown(listener_, SHUT_RDWR);
        thread_.join();
        ::close(listener_);
        ::unlink(path_.c_str());
    }
    Host(const Host&) = delete;
    Host& operator=(const Host&) = delete;

    const std::string& path() const { return path_; }
    void setAnswer(const std::string& bytes) {
        const std::lock_guard<std::mutex> lock(mutex_);
        answer_ = bytes;
    }

private:
    void serve() {
        for (int client; (client = ::accept(listener_, nullptr, nullptr)) >= 0;) {
            const std::string bytes = answer();
            char request[4096];
            (void)::recv(client, request, sizeof request, 0);
            (void)::send(client, bytes.data(), bytes.size(), MSG_NOSIGNAL);
            ::close(client);
        }
    }
    std::string answer() {
        const std::lock_guard<std::mutex> lock(mutex_);
        return answer_;
    }

    std::string path_;
    int listener_ = -1;
    std::mutex mutex_;
    std::string answer_;
    std::thread thread_;
};

void checkAnswer(const std::string& bytes) {
    static Host host;
    host.setAnswer(bytes);
    const ctl::Deadline deadline = ctl::deadlineIn(std::chrono::seconds(20));
    try {
        const ctl::Answer answer = ctl::HostClient(host.path()).ask("/v1/health", deadline);
        require(answer.status < 1000, "a status has three digits");
        require(answer.body.size() <= bytes.size(), "no body is longer than what came");
        const json document = answer.document();
        require(answer.isSuccess() && document == json::parse(answer.body),
                "a success is believed");
    } catch (const ctl::Failure& failure) {
        require(failure.status() != ctl::kNoOutcome, "an answer that ends is not waited for");
        require(*failure.what() != '\0', "a failure says why");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const bool isDocument = input.below(2) == 0;
    const std::string text(input.rest());
    isDocument ? checkDocument(text) : checkAnswer(text);
    return 0;
}
