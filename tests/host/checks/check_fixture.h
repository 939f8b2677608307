/// A home that passes every check, and what its checks find when a test has changed it.
#pragma once

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/utsname.h>

#include <clocale>
#include <map>
#include <string>

#include "host/checks/check_list.h"
#include "support/scratch_dir.h"

class CheckTest : public testing::Test {
protected:
    CheckTest() {
        std::setlocale(LC_CTYPE, "C.UTF-8");
        for (const char* name : {"home/config", "home/logs", "home/tmp", "depot"})
            scratch.makeDir(name);
        for (const char* name : {"TovrinAgent", "uninstall.sh", "um_console"})
            scratch.script(std::string("home/bin/") + name, "exit 0");
        installed({"ax", "ux"});
        scratch.script("home/agtqvs6/lx8266/bin/zav_xa", "exit 0");
        environment["QVSDEPLOY_AGENTDEPOT"] = scratch.path("depot");
        options.home = home;
        options.state = home + "/zavhost";
        options.socket = scratch.path("s");
        options.rpcSocket = scratch.path("s.rpc");
        options.plugin = ZAV_BUILD_DIR "/lib/libzavmgmt.so";
    }

    ~CheckTest() override {
        ::umask(formerMask);
        std::setlocale(LC_CTYPE, "C");
    }

    /// Makes the inventory list these products for one platform.
    void installed(const std::vector<std::string>& products) const {
        std::string list = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";
        for (const std::string& code : products)
            list += "\"" + code + "\",\"A product\",\"lx8266\",\"060100000\",\"100\"\n";
        scratch.script("home/bin/cinfo", "printf '%s' '" + list + "'");
    }
    std::vector<host::CheckResult> run() const {
        host::CheckSubject subject(options, [this](const char* name) -> const char* {
            const auto found = environment.find(name);
            return found == environment.end() ? nullptr : found->second.c_str();
        });
        return runChecks(subject);
    }
    host::Finding find(const std::string& check) const {
        for (const host::CheckResult& result : run()) {
            if (result.check == check) return result.finding;
        }
        ADD_FAILURE() << "there is no check " << check;
        return {};
    }
    /// That the check has this verdict, a text with this piece and, unless all is well, a remedy.
    void expectFinding(const std::string& check, host::Verdict verdict,
                       const std::string& piece) const {
        const host::Finding finding = find(check);
        EXPECT_STREQ(nameOf(finding.verdict), nameOf(verdict)) << check << ": " << finding.text;
        EXPECT_NE(finding.text.find(piece), std::string::npos) << check << ": " << finding.text;
        EXPECT_EQ(finding.remedy.empty(), verdict == host::Verdict::Ok) << check;
    }
    std::string runAsFile() const {
        struct utsname names {};
        ::uname(&names);
        const std::string node = names.nodename;
        return "home/config/" + node.substr(0, node.find('.')) + "_zavrunas.cfg";
    }

    const mode_t formerMask = ::umask(022);  ///< before the directories are made
    ScratchDir scratch;
    const std::string home = scratch.makeDir("home");
    std::map<std::string, std::string> environment;
    host::HostOptions options;
};
