// What the trace log of a real host shows of passwords and configurations.
// ctest-label: threaded

#include <gmock/gmock.h>

#include "support/host/managed_host.h"
#include "support/host/starter_home.h"

namespace {

using Guards = ManagedHost::Guards;
using testing::HasSubstr;
using testing::Not;

class MaskedTrace : public testing::Test {
protected:
    /// The whole trace of a host that sets a configuration, reads it, and installs with a password
    /// in the command line, which the command writes as well.
    std::string traceWith(Guards guards, const std::vector<std::string>& arguments) const {
        StarterHome home("ux");
        ManagedHost host(home.path(), Environment{{"KBB_RAS1", "ALL"}}, arguments, guards);
        const std::string configuration = "INSTANCE=\nINTERVAL=7\nCOLOUR=auburn\n";
        EXPECT_EQ(host.zavctl({"config", "set", "ux", configuration}).status, 0);
        EXPECT_EQ(host.zavctl({"config", "get", "ux"}).out, configuration);
        host.zavctl({"install", "ux", "100", "--", "/bin/echo", "password=hunter2",
                     "DB_KEY:", "sesame", "in clear"});
        return host.stop(), host.trace();
    }
};

TEST_F(MaskedTrace, AGuardedHostsLogHoldsNoSecret) {
    const std::string trace = traceWith(Guards::On, {});
    for (const char* secret : {"auburn", "hunter2", "sesame"})
        EXPECT_THAT(trace, Not(HasSubstr(secret)));
    EXPECT_THAT(trace, HasSubstr("outbuf: ***\n"));
    EXPECT_THAT(trace, HasSubstr(" is: ***\n"));
    EXPECT_THAT(trace, HasSubstr("outbuf: password=*** DB_KEY: *** in clear"));
}

TEST_F(MaskedTrace, TraceSecretsShowsThem) {
    const std::string trace = traceWith(Guards::On, {"--trace-secrets"});
    for (const char* secret : {"auburn", "hunter2", "sesame"})
        EXPECT_THAT(trace, HasSubstr(secret));
}

TEST_F(MaskedTrace, AnUnguardedHostsLogShowsThem) {
    const std::string trace = traceWith(Guards::Off, {});
    for (const char* secret : {"auburn", "hunter2", "sesame"})
        EXPECT_THAT(trace, HasSubstr(secret));
}

}  // namespace
