/// The console that the centre serves to browsers.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "ctl/console/page_files.h"
#include "fleet/server/api/centre_api.h"
#include "http/handler.h"

namespace fleet {

/// Stands before the centre's interface and tells browsers from programs. A program shows a session
/// that an operator's key has opened, or bytes that are signed, and its request is handed on as it
/// is. Whatever comes with a cookie, or is not of the interface, is a browser's: it may only read,
/// from this console's own page, in a session that a link has opened. Nothing that a browser keeps
/// gives it more. Everything is called on the server's I/O thread.
class CentreConsole final : public http::Handler {
public:
    /// The services and the interface outlive it. Throws UrlError if the fleet's URL makes no
    /// sense, and std::runtime_error if the page has no index.html.
    CentreConsole(ApiServices& services, CentreApi& api, std::vector<console::PageFile> page);

    /// The path and the token of the link that opens the console once.
    static std::string openingFor(const std::string& token);

    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    http::BodyPlan planFor(const http::Request& head) override;
    const std::vector<std::string>& wantedFields() const override;
    const http::Fields& commonFields() const override;
    void prepareForEnd() override { api_.prepareForEnd(); }
    bool quiet() const override { return api_.quiet(); }

private:
    std::optional<http::Reply> refusalOf(const http::Request& request) const;
    std::string tokenOf(const http::Request& request) const;
    http::Reply open(const http::Request& request);
    std::optional<OperatorGrant> grantOf(const std::string& token) const;
    http::Answer describe(const std::string& token) const;

    ApiServices& services_;
    CentreApi& api_;
    const std::string host_;    ///< as browsers name it in the field Host
    const std::string cookie_;  ///< the cookie's name
    const console::PageFiles page_;
};

}  // namespace fleet
