// Bundles: making, installing and removing products.
#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <memory>
#include <utility>

#include "home/home_fixture.h"

using ::testing::HasSubstr;
using ::testing::Not;

namespace {

class Bundle : public PreparedHomeTest {
protected:
    std::string inBundle(const std::string& file = "") const {
        return scratch.path("bundle" + (file.empty() ? "" : "/" + file));
    }
    Outcome make(const std::string& product, const std::vector<std::string>& environment = {}) {
        return run({source("bundles/make-bundle"), product, inBundle()}, "", environment);
    }
    Outcome install(const std::vector<std::string>& options = {"-a", "lx8266"}) {
        std::vector<std::string> words{"/bin/sh", inBundle("install.sh"), "-h", home()};
        words.insert(words.end(), options.begin(), options.end());
        return run(words);
    }
    Outcome uninstall(const std::string& product, const std::string& arch = "lx8266") {
        return run({inHome("bin/uninstall.sh"), "-i", product, arch});
    }
    std::string inventory() { return run({inHome("bin/cinfo"), "-d"}).out; }

    /// Whatever of the product is left below the home.
    std::string traces(const std::string& product) {
        return run({"/bin/sh", "-c",
                    "cd '" + home() + "' && find . -name '*" + product + "*' ! -name '*.tbl'"})
            .out;
    }

    /// A package server whose package holds this program.
    std::vector<std::string> distribution(const std::string& program) {
        scratch.script("package/usr/bin/prometheus-node-exporter", program);
        scratch.write("package/usr/share/doc/prometheus-node-exporter/copyright", "Apache-2.0\n");
        scratch.write("package/DEBIAN/control",
                      "Package: prometheus-node-exporter\nVersion: 1.15.2-3+b6\nArchitecture: all\n"
                      "Maintainer: nobody <nobody@localhost>\nDescription: test\n");
        scratch.script("tools/apt-get", "case $* in *download*) exec dpkg-deb -b " +
                                            scratch.path("package") +
                                            " prometheus-node-exporter_1.15.2-3_all.deb;; esac\n");
        return {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin:/usr/sbin:/sbin"};
    }

    /// The machine's own platform, as the bundle of a binary has it.
    std::string machineArch() {
        return run({"/bin/sh", "-c",
                    "set -- " + inHome("registry/archdsc.tbl") + "; . " +
                        inHome("bin/dynarch.shl") + "; printf %s \"$cArch\""})
            .out;
    }
};

TEST_F(Bundle, IsMadeInstalledAndRemoved) {
    ASSERT_EQ(uninstall("ux").status, 0);
    EXPECT_THAT(inventory(), Not(HasSubstr("\"ux\"")));
    EXPECT_EQ(traces("ux"), "");

    const Outcome made = make("ux");
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(made.out, "010000000\n");
    const Outcome installed = install();
    EXPECT_EQ(installed.status, 0) << installed.err;
    EXPECT_THAT(inventory(), HasSubstr("\"ux\",\"Monitoring agent for load and memory and disk\","
                                       "\"lx8266\",\"010000000\",\"100\""));
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\n");
    EXPECT_EQ(agent({"start", "ux"}).status, 0);
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
}

TEST_F(Bundle, TransferredFilesHaveOneModeAndStillInstallAsTheyShould) {
    ASSERT_EQ(make("ux").status, 0);
    for (const auto& file : std::filesystem::recursive_directory_iterator(inBundle())) {
        if (file.is_regular_file()) ::chmod(file.path().c_str(), 0770);
    }
    ASSERT_EQ(install().status, 0);
    const auto mode = [&](const std::string& file) {
        struct stat info {};
        ::stat(inHome("agtqvs6/lx8266/ux/" + file).c_str(), &info);
        return info.st_mode & 0777U;
    };
    EXPECT_EQ(mode("bin/agent"), 0755U);
    EXPECT_EQ(mode("agent.cfg"), 0644U);
}

TEST_F(Bundle, SharedComponentIsABundleToo) {
    ASSERT_EQ(make("ax").status, 0);
    std::filesystem::remove_all(inHome("agtqvs6/lx8266/bin"));
    ASSERT_EQ(install().status, 0);
    EXPECT_EQ(translate({"-i", "a:hostA:UX", "-pc", "ux"}).out, "a\n");
    EXPECT_FALSE(exists("agtqvs6/lx8266/.ax.new"));
}

TEST_F(Bundle, IncompleteOrDamagedTransferInstallsNothing) {
    ASSERT_EQ(make("ux").status, 0);
    const std::string before = read("agtqvs6/lx8266/ux/agent.cfg");
    scratch.write("bundle/files/agent.cfg", "INTERVAL=1\n");
    EXPECT_EQ(install().status, 28);
    std::filesystem::remove(inBundle("files/agent.cfg"));
    EXPECT_EQ(install().status, 28);
    std::filesystem::remove(inBundle("manifest"));
    EXPECT_EQ(install().status, 28);
    std::filesystem::remove(inBundle("product.dsc"));
    EXPECT_EQ(install().status, 28);
    EXPECT_EQ(read("agtqvs6/lx8266/ux/agent.cfg"), before);
}

TEST_F(Bundle, FailingInstallationLeavesTheHomeAsItWas) {
    ASSERT_EQ(make("ux").status, 0);
    const std::string before = read("registry/uxlx8266.ver");
    write("agtqvs6/lx8266/ux/mark", "old");
    scratch.script("tools/mv",
                   "case \"$*\" in *uxlx8266.ver) exit 1;; *) exec /bin/mv \"$@\";; esac\n");
    const Outcome failed = run({"/bin/sh", inBundle("install.sh"), "-h", home(), "-a", "lx8266"},
                               "", {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin"});
    EXPECT_EQ(failed.status, 8) << failed.err;
    EXPECT_EQ(read("agtqvs6/lx8266/ux/mark"), "old");
    EXPECT_EQ(read("registry/uxlx8266.ver"), before);
    std::size_t entries = 0;
    for (const auto& each : std::filesystem::directory_iterator(inHome("agtqvs6/lx8266"))) {
        EXPECT_NE(each.path().filename().string()[0], '.') << each.path();
        ++entries;
    }
    EXPECT_EQ(entries, 3U);
}

TEST_F(Bundle, LeftoversOfAKilledInstallationAreRepaired) {
    ASSERT_EQ(make("ux").status, 0);
    std::filesystem::rename(inHome("agtqvs6/lx8266/ux"), inHome("agtqvs6/lx8266/.ux.old"));
    write("agtqvs6/lx8266/.ux.new/half", "x");
    ASSERT_EQ(install().status, 0);
    EXPECT_TRUE(exists("agtqvs6/lx8266/ux/bin/agent"));
    EXPECT_FALSE(exists("agtqvs6/lx8266/ux/half"));
    EXPECT_FALSE(exists("agtqvs6/lx8266/.ux.old"));
    EXPECT_FALSE(exists("agtqvs6/lx8266/.ux.new"));
}

TEST_F(Bundle, RunningAgentIsNotDisturbedByANewVersion) {
    ASSERT_EQ(make("ux").status, 0);
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\nINTERVAL=1\n");
    ASSERT_EQ(agent({"start", "ux"}).status, 0);
    const pid_t pid = pidOf("ux");
    ASSERT_EQ(install().status, 0);
    EXPECT_TRUE(lives(pid));
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
    EXPECT_EQ(agent({"start", "ux"}).status, 0);
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
}

TEST_F(Bundle, BundleForAnotherPlatformIsRefused) {
    ASSERT_EQ(make("ux").status, 0);
    const std::string text = scratch.read("bundle/product.dsc");
    const auto at = text.find("Platform=any");
    scratch.write("bundle/product.dsc", std::string(text).replace(at, 12, "Platform=zz9999"));
    run({"/bin/sh", "-c",
         "cd " + inBundle() + " && . " + inHome("lib/install.sh") +
             " && find files product.dsc -type f -exec sha256sum {} + | seal >manifest"});
    const Outcome refused = install();
    EXPECT_EQ(refused.status, 29);
    EXPECT_THAT(refused.err, HasSubstr("zz9999"));
    EXPECT_EQ(install({"-a", "zz9999"}).status, 0);
    EXPECT_TRUE(exists("agtqvs6/zz9999/ux/bin/agent"));
}

TEST_F(Bundle, WrongUsageOfTheInstaller) {
    ASSERT_EQ(make("ux").status, 0);
    EXPECT_EQ(run({"/bin/sh", inBundle("install.sh")}).status, 1);
    EXPECT_EQ(run({"/bin/sh", inBundle("install.sh"), "-h"}).status, 1);
    EXPECT_EQ(install({"what"}).status, 1);
    EXPECT_EQ(run({"/bin/sh", inBundle("install.sh"), "-h", scratch.path()}).status, 2);
}

TEST_F(Bundle, WrongUsageOfItsMaker) {
    EXPECT_EQ(run({source("bundles/make-bundle")}).status, 1);
    EXPECT_EQ(make("zz").status, 23);
    ASSERT_EQ(make("ux").status, 0);
    EXPECT_EQ(make("ux").status, 8) << "the folder is not empty any more";
}

TEST_F(Bundle, UninstallStopsWhatRunsAndLeavesNoTrace) {
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\n");
    write("config/ux_b.cfg", "INSTANCE=b\nSTART_SECONDS=0\n");
    ASSERT_EQ(agent({"start", "ux"}).status, 0);
    ASSERT_EQ(agent({"start", "-o", "b", "ux"}).status, 0);
    const pid_t first = pidOf("ux"), second = pidOf("ux_b");
    const Outcome removed = uninstall("ux");
    EXPECT_EQ(removed.status, 0) << removed.err;
    EXPECT_FALSE(lives(first));
    EXPECT_FALSE(lives(second));
    EXPECT_EQ(traces("ux"), "");
    EXPECT_TRUE(exists("agtqvs6/lx8266/um/bin/agent"));
    EXPECT_TRUE(exists("config/um.config"));
}

TEST_F(Bundle, UninstallOfOnePlatformLeavesTheOthers) {
    ASSERT_EQ(make("ux").status, 0);
    ASSERT_EQ(install({"-a", "li6263"}).status, 0);
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\n");
    ASSERT_EQ(agent({"start", "ux"}).status, 0);
    const bool own = machineArch() != "li6263";
    EXPECT_EQ(uninstall("ux", own ? "li6263" : "lx8266").status, 0);
    EXPECT_TRUE(lives(pidOf("ux")));
    EXPECT_TRUE(exists("config/ux.cfg"));
    EXPECT_EQ(uninstall("ux", own ? "lx8266" : "li6263").status, 0);
    EXPECT_EQ(traces("ux"), "");
}

TEST_F(Bundle, UninstallOfWhatIsNotInstalledIsRefused) {
    for (const auto& [product, arch] :
         std::vector<std::pair<std::string, std::string>>{{"zz", "lx8266"}, {"ux", "li6263"}}) {
        const Outcome refused = uninstall(product, arch);
        EXPECT_EQ(refused.status, 3);
        EXPECT_THAT(refused.err, HasSubstr("is not installed for " + arch));
    }
    EXPECT_TRUE(exists("agtqvs6/lx8266/ux/bin/agent"));
}

TEST_F(Bundle, HalfOfAProductCanBeRemovedToo) {
    std::filesystem::remove_all(inHome("agtqvs6/lx8266/ux"));
    EXPECT_EQ(uninstall("ux").status, 0);
    EXPECT_THAT(inventory(), Not(HasSubstr("\"ux\"")));
    std::filesystem::remove(inHome("registry/umlx8266.ver"));
    EXPECT_EQ(uninstall("um").status, 0);
    EXPECT_FALSE(exists("agtqvs6/lx8266/um"));
}

TEST_F(Bundle, SharedComponentStaysAsLongAsItIsNeeded) {
    EXPECT_EQ(uninstall("ax").status, 20);
    EXPECT_TRUE(exists("agtqvs6/lx8266/bin/zav_xa"));
    ASSERT_EQ(uninstall("ux").status, 0);
    ASSERT_EQ(uninstall("um").status, 0);
    EXPECT_EQ(uninstall("ax").status, 0);
    EXPECT_FALSE(exists("agtqvs6/lx8266"));
}

TEST_F(Bundle, WrongUsageOfUninstall) {
    const std::string program = inHome("bin/uninstall.sh");
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{program},
                                               {program, "-i", "ux"},
                                               {program, "ux", "lx8266", "-i"},
                                               {program, "-i", "../bin", "lx8266"},
                                               {program, "-i", "ux", ".."},
                                               {program, "-i", "bin", "lx8266"},
                                               {program, "-i", "ux", "lx8266", "more"}}) {
        EXPECT_EQ(run(words).status, 1) << ::testing::PrintToString(words);
    }
    EXPECT_TRUE(exists("agtqvs6/lx8266/ux/bin/agent"));
}

TEST_F(Bundle, StartsAndInstallationsAtOnceLeaveAWholeProduct) {
    ASSERT_EQ(make("ux").status, 0);
    write("config/ux.cfg", "INSTANCE=\nSTART_SECONDS=0\n");
    std::vector<std::unique_ptr<Program>> all;
    const auto launch = [&](const std::vector<std::string>& words) {
        all.push_back(std::make_unique<Program>(words));
    };
    for (int i = 0; i < 3; ++i) {
        launch({"/bin/sh", inBundle("install.sh"), "-h", home(), "-a", "lx8266"});
        launch({inHome("bin/TovrinAgent"), "-h", home(), "start", "-o", std::to_string(i), "ux"});
    }
    for (auto& each : all)
        EXPECT_EQ(each->wait().status, 0);
    EXPECT_TRUE(exists("agtqvs6/lx8266/ux/bin/agent"));
    EXPECT_EQ(uninstall("ux").status, 0);
    EXPECT_EQ(traces("ux"), "");
}

TEST_F(Bundle, NodeExporterComesOutOfTheDistributionsPackage) {
    const Outcome made = make("ne", distribution("echo exporter \"$@\"; exec sleep 600\n"));
    ASSERT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(made.out, "011502000\n");
    ASSERT_EQ(install({}).status, 0);
    EXPECT_THAT(inventory(), HasSubstr("\"ne\",\"Prometheus node exporter\",\"" + machineArch() +
                                       "\",\"011502000\",\"3+b6\""));
    write("config/ne.cfg", "INSTANCE=\nSTART_SECONDS=0\nPORT=39187\n");
    EXPECT_EQ(agent({"start", "ne"}).status, 0);
    EXPECT_TRUE(eventually([&] {
        return read("logs/ne.log").find("exporter --web.listen-address=127.0.0.1:39187\n") !=
               std::string::npos;
    }));
    EXPECT_EQ(uninstall("ne", machineArch()).status, 0);
    EXPECT_EQ(traces("ne.cfg"), "");
}

TEST_F(Bundle, WithoutTheDistributionTheNodeExportersBundleSaysSo) {
    scratch.script("tools/apt-get", "echo 'E: Unable to locate package' >&2\nexit 100\n");
    const Outcome made = make("ne", {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin"});
    EXPECT_EQ(made.status, 30);
    EXPECT_EQ(made.out, "");
    EXPECT_THAT(made.err, HasSubstr("could not be downloaded from the distribution"));
}

TEST_F(Bundle, PortThatIsTakenIsNamed) {
    ASSERT_EQ(make("ne", distribution("exec sleep 600\n")).status, 0);
    ASSERT_EQ(install({}).status, 0);
    const int listener = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    ASSERT_EQ(::bind(listener, reinterpret_cast<sockaddr*>(&address), size), 0);
    ASSERT_EQ(::listen(listener, 1), 0);
    ASSERT_EQ(::getsockname(listener, reinterpret_cast<sockaddr*>(&address), &size), 0);
    const std::string port = std::to_string(ntohs(address.sin_port));
    write("config/ne.cfg", "INSTANCE=\nPORT=" + port + "\n");
    const Outcome refused = agent({"start", "ne"});
    EXPECT_EQ(refused.status, 6);
    EXPECT_THAT(refused.err, HasSubstr("port " + port + " of 127.0.0.1 is taken"));
    ::close(listener);
}

TEST_F(Bundle, PortThatIsNoneIsRefused) {
    ASSERT_EQ(make("ne", distribution("exec sleep 600\n")).status, 0);
    ASSERT_EQ(install({}).status, 0);
    for (const char* port : {"", "0", "080", "65536", "abc", "9100 "}) {
        write("config/ne.cfg", "INSTANCE=\nPORT=" + std::string(port) + "\n");
        const Outcome refused = agent({"start", "ne"});
        EXPECT_EQ(refused.status, 6) << port;
        EXPECT_THAT(refused.err, HasSubstr("PORT is not a number from 1 to 65535")) << port;
    }
}

}  // namespace
