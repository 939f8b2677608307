// The guard of the list of run-as users.
#include <sys/utsname.h>

#include "host/guard/guard_fixture.h"

namespace {

class RunAsGuard : public GuardTest {
protected:
    RunAsGuard() {
        translator("exit 0");
        files.write("depot/um.mdl", "APPL=X\n");
        files.script("home/bin/um_console", "exit 0");
    }
    std::string list() const {
        struct utsname names {};
        ::uname(&names);
        const std::string node = names.nodename;
        return "home/config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg";
    }
    std::vector<Conditions> starts() const {
        return {command("START", "ux"), command("RESTART", "ux"),
                command("SETCONFIG", "um", {{"UACONFIG", "um.mdl"}}),
                command("SETCONFIG", "UM", {{"UACONFIG", "um.mdl"}})};
    }
};

TEST_F(RunAsGuard, RefusesWhatStartsAgentsWhileTheListIsDamaged) {
    files.write(list(), "<runas><agent>");
    for (const Conditions& start : starts()) {
        EXPECT_EQ(refusalOf(start, true),
                  "run-as 409: " + files.path(list()) +
                      " says which agents run as another user, but it does not parse: it ends "
                      "before its elements do; the agent would run as the host's user; correct the "
                      "file, or remove it");
    }
    accept("INSTALL", "ux");
    EXPECT_EQ(refuser(command("START", "ux")), "run-as") << "no installation mends the list";
}

TEST_F(RunAsGuard, LetsOtherCommandsPass) {
    files.write(list(), "<runas><agent>");
    for (const char* name : {"STOP", "UNINSTALL", "GETCONFIG"})
        EXPECT_EQ(refusalOf(command(name, "ux")), "") << name;
    EXPECT_EQ(refusalOf(command("SETCONFIG", "ux", {{"CONTEXT", "INSTANCE=\n"}})), "");
}

TEST_F(RunAsGuard, LetsStartsPassWithoutAListAndWithAWholeOne) {
    EXPECT_EQ(refusalOf(starts().front()), "");
    files.write(list(), "<runas>\n</runas>\n");
    for (const Conditions& start : {starts()[0], starts()[1], starts()[2]})
        EXPECT_EQ(refusalOf(start), "");
}

TEST_F(RunAsGuard, AnEntryThatWouldBeOverlookedIsRefusedToo) {
    files.write(list(), "<runas><agent></agent></runas>");
    EXPECT_EQ(refuser(command("START", "ux")), "run-as");
}

}  // namespace
