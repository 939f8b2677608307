#include "host/process/configuration/configuration_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/process/start_error.h"
#include "support/scratch_dir.h"

namespace {

class ConfigurationFile : public testing::Test {
protected:
    host::Settings read(const std::string& content) {
        scratch.write("zavhost.conf", content);
        return host::readConfigurationFile(file);
    }
    /// What the complaint says behind the file's name.
    std::string errorOf(const std::string& content) {
        try {
            read(content);
        } catch (const host::StartError& error) {
            const std::string text = error.what();
            EXPECT_EQ(text.rfind(file, 0), 0U) << text;
            EXPECT_EQ(text.find('\n'), std::string::npos) << text;
            return text.substr(file.size());
        }
        return "";
    }
    std::string refusalOf(const std::string& path) {
        try {
            host::readConfigurationFile(path);
        } catch (const host::StartError& error) {
            return error.what();
        }
        return "";
    }

    ScratchDir scratch;
    const std::string file = scratch.path("zavhost.conf");
};

TEST_F(ConfigurationFile, HoldsTextsNumbersAndFlagsWithTheirLines) {
    const host::Settings settings = read(
        "# a comment\n"
        "home = \"/opt/\\\"tovrin\\\"\"\n"
        "\n"
        "rpc-port = 1_35\n"
        "unguarded = true\n"
        "trace-secrets = false\n");
    EXPECT_EQ(settings.text("home"), "/opt/\"tovrin\"");
    EXPECT_EQ(settings.source("home"), file + ":2");
    EXPECT_EQ(settings.text("rpc-port"), "135");
    EXPECT_EQ(settings.source("rpc-port"), file + ":4");
    EXPECT_TRUE(settings.flag("unguarded"));
    EXPECT_FALSE(settings.flag("trace-secrets"));
    EXPECT_EQ(settings.source("trace-secrets"), file + ":6");
    EXPECT_EQ(settings.source("state"), "");
}

TEST_F(ConfigurationFile, MayBeEmpty) {
    EXPECT_EQ(read("").find("home"), nullptr);
}

TEST_F(ConfigurationFile, AnUnknownKeyIsRefusedWithItsLineAndTheNearestName) {
    EXPECT_EQ(errorOf("grace = 5\nmax-queue = 7\n"),
              ":2: there is no option \"max-queue\"; did you mean max-queued?");
    EXPECT_EQ(errorOf("\n[section]\ngrace = 5\n"), ":2: there is no option \"section\"");
}

TEST_F(ConfigurationFile, TheFirstBadLineIsTheOneThatIsNamed) {
    EXPECT_EQ(errorOf("zzzzzzzzzz = 1\naaaaaaaaaa = 1\n"), ":1: there is no option \"zzzzzzzzzz\"");
}

TEST_F(ConfigurationFile, AValueOfAnotherKindIsRefusedWithItsLine) {
    EXPECT_EQ(errorOf("\nhome = 7"), ":2: home takes a text in quotes");
    EXPECT_EQ(errorOf("grace = \"7\""), ":1: grace takes a whole number without quotes");
    EXPECT_EQ(errorOf("grace = 7.5"), ":1: grace takes a whole number without quotes");
    EXPECT_EQ(errorOf("unguarded = 1"), ":1: unguarded takes true or false");
    EXPECT_EQ(errorOf("home.x = \"y\""), ":1: home takes a text in quotes");
    EXPECT_EQ(errorOf("home = \"a\\u0000b\""), ":1: home holds a null character");
}

TEST_F(ConfigurationFile, ARepeatedKeyIsRefusedWithTheLineOfItsRepetition) {
    const std::string error = errorOf("grace = 5\nhome = \"/h\"\ngrace = 6\n");
    EXPECT_EQ(error.rfind(":3: ", 0), 0U) << error;
    EXPECT_NE(error.find("grace"), std::string::npos) << error;
}

TEST_F(ConfigurationFile, WhatIsNoTomlIsRefusedWithItsLine) {
    EXPECT_EQ(errorOf("grace = 5\nhome = \"/h\n").rfind(":2: ", 0), 0U);
    EXPECT_EQ(errorOf("grace = 99999999999999999999\n").rfind(":1: ", 0), 0U);
    EXPECT_EQ(errorOf("\nhome = \"\xFF\"\n").rfind(":2: ", 0), 0U);
}

TEST_F(ConfigurationFile, WhatBelongsOnTheCommandLineIsRefused) {
    EXPECT_EQ(errorOf("check = true"), ":1: check belongs on the command line");
    EXPECT_EQ(errorOf("config = \"/x\""), ":1: config belongs on the command line");
    EXPECT_EQ(errorOf("print-config = true"), ":1: print-config belongs on the command line");
}

TEST_F(ConfigurationFile, OthersMustNotBeAbleToWriteIt) {
    read("grace = 5\n");
    for (const mode_t mode : {0664U, 0646U}) {
        ASSERT_EQ(::chmod(file.c_str(), mode), 0);
        EXPECT_EQ(refusalOf(file),
                  "configuration " + file +
                      ": others own it or may write to it; give it to the host's user or to root, "
                      "and take the write permission from group and others (chmod go-w)");
    }
    ASSERT_EQ(::chmod(file.c_str(), 0644), 0);
    EXPECT_EQ(refusalOf(file), "");
}

TEST_F(ConfigurationFile, OthersMustNotOwnIt) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can give a file away";
    read("grace = 5\n");
    ASSERT_EQ(::chown(file.c_str(), 12345, 0), 0);
    EXPECT_NE(refusalOf(file), "");
}

TEST_F(ConfigurationFile, MustBeAFileOfSensibleLength) {
    EXPECT_EQ(refusalOf(scratch.path("lost")),
              "configuration " + scratch.path("lost") + ": No such file or directory");
    EXPECT_EQ(refusalOf(scratch.path()), "configuration " + scratch.path() + ": is no plain file");
    const std::string pipe = scratch.path("pipe");
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    EXPECT_EQ(refusalOf(pipe), "configuration " + pipe + ": is no plain file");
    scratch.write("zavhost.conf", std::string((1 << 20) + 1, '\n'));
    EXPECT_EQ(refusalOf(file), "configuration " + file + ": is longer than 1 MiB");
}

}  // namespace
