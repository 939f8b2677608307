#include "ctl/verbs/arguments/global_arguments.h"

namespace ctl {

HostAddress hostAddressOf(const Values& given) {
    HostAddress host;
    host.socket = given.text(kSocket).empty() ? defaultSocket() : given.text(kSocket);
    host.rpcSocket = given.text(kRpcSocket).empty() ? host.socket + ".rpc" : given.text(kRpcSocket);
    host.timeout =
        std::chrono::milliseconds(static_cast<long long>(given.seconds(kTimeout) * 1000.0));
    return host;
}

Format formatOf(const Values& given) {
    return given.flag(kJson) ? Format::Json : Format::Text;
}

}  // namespace ctl
