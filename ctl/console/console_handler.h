/// What the console answers.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/console/browser_session.h"
#include "ctl/console/browsers.h"
#include "ctl/console/host_streams.h"
#include "ctl/console/page_files.h"
#include "ctl/console/upload.h"
#include "http/handler.h"

namespace console {

struct ConsoleSettings {
    ctl::HostAddress host;
    std::vector<PageFile> page;
    std::vector<std::string> command = {"zavctl"};  ///< what a line to copy begins with
    std::string uploadDirectory = "/var/tmp";       ///< where files wait for the host
    Browsers browsers{};
    BrowserSession::Clock clock = BrowserSession::timeSinceBoot;
};

/// Checks every request before it does anything: where it comes from, then whose it is. Everything
/// is called on the server's I/O thread, which the requests to the host do not use.
class ConsoleHandler final : public http::Handler {
public:
    /// `port` is where the server listens. Throws std::runtime_error.
    ConsoleHandler(ConsoleSettings settings, std::uint16_t port);

    /// The path and the token of the link that opens the console once.
    std::string opening() const;

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    http::BodyPlan planFor(const http::Request& head) override;
    const std::vector<std::string>& wantedFields() const override;
    const http::Fields& commonFields() const override;
    void prepareForEnd() override {}
    /// Whether nothing is under way that changes something at the host.
    bool quiet() const override;

private:
    std::optional<http::Reply> refusalOf(const http::Request& request) const;
    http::Reply open(const http::Request& request);
    http::Reply answerOwn(const http::Request& request) const;
    http::Job hand(http::Request request);

    const ctl::HostAddress host_;
    const std::uint16_t port_;
    const std::string description_;
    const PageFiles page_;
    BrowserSession session_;
    Uploads uploads_;
    HostStreams streams_;
    /// Requests to the host that may change something.
    const std::shared_ptr<std::atomic<int>> reads_ = std::make_shared<std::atomic<int>>(0);
    const std::shared_ptr<std::atomic<int>> changes_ = std::make_shared<std::atomic<int>>(0);
};

}  // namespace console
