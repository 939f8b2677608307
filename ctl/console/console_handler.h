/// What the console answers.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "ctl/console/backend.h"
#include "ctl/console/browser_session.h"
#include "ctl/console/browsers.h"
#include "ctl/console/page_files.h"
#include "http/handler.h"

namespace console {

struct ConsoleSettings {
    std::vector<PageFile> page;
    Browsers browsers{};
    BrowserSession::Clock clock = BrowserSession::timeSinceBoot;
};

/// Checks every request before it does anything: where it comes from, then whose it is. The page is
/// answered here, and the rest by what is behind it. Everything is called on the server's I/O
/// thread.
class ConsoleHandler final : public http::Handler {
public:
    /// `port` is where the server listens; the backend outlives the handler. Throws
    /// std::runtime_error.
    ConsoleHandler(ConsoleSettings settings, Backend& backend, std::uint16_t port);

    /// The path and the token of the link that opens the console once.
    std::string opening() const;

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    http::BodyPlan planFor(const http::Request& head) override;
    const std::vector<std::string>& wantedFields() const override;
    const http::Fields& commonFields() const override;
    void prepareForEnd() override { backend_.prepareForEnd(); }
    bool quiet() const override { return backend_.quiet(); }

private:
    std::optional<http::Reply> refusalOf(const http::Request& request) const;
    http::Reply open(const http::Request& request);

    Backend& backend_;
    const std::uint16_t port_;
    const PageFiles page_;
    BrowserSession session_;
};

}  // namespace console
