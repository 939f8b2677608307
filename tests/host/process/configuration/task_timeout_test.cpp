#include "host/process/configuration/task_timeout.h"

#include <gtest/gtest.h>

#include <cstdlib>

#include "host/process/start_error.h"
#include "support/scoped_env.h"

namespace {

using host::chooseTaskTimeout;
using host::StartError;
using host::taskTimeoutOf;

const char* systemVariable(const char* name) {
    return std::getenv(name);
}

TEST(TaskTimeout, IsAWholeNumberOfSeconds) {
    EXPECT_EQ(taskTimeoutOf("it", "1"), 1);
    EXPECT_EQ(taskTimeoutOf("it", "2147483646"), 2147483646);
    for (const char* text : {"", "0", "-1", "5 ", " 5", "5s", "x", "2147483647", "99999999999"}) {
        EXPECT_THROW(taskTimeoutOf("it", text), StartError) << text;
    }
}

TEST(TaskTimeout, OfTheCommandLineGoesBeforeTheVariable) {
    const ScopedEnv before("TIMEOUT", "nonsense");
    chooseTaskTimeout(7, true, systemVariable);
    EXPECT_STREQ(std::getenv("TIMEOUT"), "7");
}

TEST(TaskTimeout, AVariableThatIsNoNumberRefusesTheStart) {
    const ScopedEnv before("TIMEOUT", "5m");
    try {
        chooseTaskTimeout(std::nullopt, true, systemVariable);
        FAIL() << "nothing was thrown";
    } catch (const StartError& error) {
        EXPECT_STREQ(error.what(),
                     "TIMEOUT takes a number of seconds from 1 to 2147483646, not \"5m\"");
    }
}

TEST(TaskTimeout, AnUnguardedHostLeavesTheVariableToThePlugIn) {
    const ScopedEnv before("TIMEOUT", "5m");
    EXPECT_NO_THROW(chooseTaskTimeout(std::nullopt, false, systemVariable));
    EXPECT_STREQ(std::getenv("TIMEOUT"), "5m");
}

}  // namespace
