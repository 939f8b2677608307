#include "ctl/client/http/transport.h"

#include "ctl/client/address/no_host.h"
#include "ctl/client/address/peer.h"
#include "ctl/client/http/bounded_json.h"

using nlohmann::json;

namespace ctl {
namespace {

ExitStatus statusOfRefusal(unsigned status) {
    if (status < 400) return kNoHost;  // no refusal at all: nothing that a host says
    const bool forNow = status == 403 || status == 409 || status == 429 || status >= 500;
    return forNow ? kHostReportedFailure : kWrongUsage;
}

/// A member that is text; empty if there is none.
std::string memberText(const json& object, const char* name) {
    const auto found = object.find(name);
    return found != object.end() && found->is_string() ? found->get<std::string>() : std::string();
}

}  // namespace

Transport::Transport(const std::string& path) : path_(path), socket_(context_) {
    Error error;
    try {
        socket_.connect(boost::asio::local::stream_protocol::endpoint(path), error);
    } catch (const boost::system::system_error& tooLong) {
        error = tooLong.code();
    }
    if (error) throw noHost(path, error.value());
    refuseStranger(socket_.native_handle(), path);
}

/// The operation's handler refers to its caller's variables, so it is run before the caller
/// returns.
void Transport::abandon() {
    Error ignored;
    socket_.close(ignored);
    context_.restart();
    context_.run();
}

BrokenConnection Transport::broken(const Error& error) const {
    return BrokenConnection("the connection to the host at " + path_ +
                            " broke: " + error.message());
}

Failure refusal(unsigned status, const std::string& body) {
    const json answer = objectIn(body);
    std::string text = memberText(answer, "error");
    if (text.empty()) text = "status " + std::to_string(status);
    if (status < 400) text = "it answers with status " + std::to_string(status);
    return {statusOfRefusal(status), "the host refused the request: " + text,
            memberText(answer, "hint"), memberText(answer, "guard")};
}

}  // namespace ctl
