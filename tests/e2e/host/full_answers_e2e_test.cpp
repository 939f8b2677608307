// What a guarded host says beside the rows: a configuration in full, and why an inventory is empty.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <optional>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/vfork.h"

namespace {

using nlohmann::json;
using Guards = ManagedHost::Guards;

constexpr std::size_t kContextBytes = 3072;

class AnswersOfTheHost : public testing::Test {
protected:
    AnswersOfTheHost() { home.products({"ux"}, "exit 0"); }

    void start(Guards guards, const char* locale = "C.UTF-8") {
        host.emplace(home.path(),
                     Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}, {"LC_ALL", locale}},
                     std::vector<std::string>{}, guards);
    }
    json query(const std::string& body) const {
        RawClient client(host->socket());
        return json::parse(client.post("/v1/query", body).body);
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

class FullConfiguration : public AnswersOfTheHost {
protected:
    /// What the translator prints when it is asked for the configuration.
    void translatorPrints(const std::string& output) {
        home.files().write("home/output", output);
        home.products({"ux"}, "cat '" + home.path() + "/output'");
    }
    json getConfiguration() const {
        return query(R"({"table":"KAGREQT","where":[)"
                     R"({"column":"COMMAND","op":"=","value":"GETCONFIG"},)"
                     R"({"column":"PRODUCT","op":"=","value":"ux"},)"
                     R"({"column":"TRANSID","op":"=","value":"t"}]})");
    }
    static json full(const std::string& text, bool complete = true) {
        return {{{"row", 0}, {"column", "CONTEXT"}, {"text", text}, {"complete", complete}}};
    }
};

/// A configuration of this many bytes, none of them at a round place the same.
std::string configuration(std::size_t bytes) {
    std::string text = "INSTANCE=inst1\n";
    for (int i = 0; text.size() < bytes; ++i)
        text += "SETTING_" + std::to_string(i) + "=value\n";
    text.resize(bytes, 'x');
    return text;
}

TEST_F(FullConfiguration, StandsBesideTheRowWhateverItsLength) {
    start(Guards::On);
    for (const std::size_t bytes : {std::size_t{10}, kContextBytes - 1, kContextBytes,
                                    kContextBytes + 1, std::size_t{6201}, std::size_t{100000}}) {
        const std::string text = configuration(bytes);
        translatorPrints("a line before\n" + text);
        const json answer = getConfiguration();
        EXPECT_EQ(answer["rows"][0]["CONTEXT"], text.substr(0, kContextBytes)) << bytes;
        EXPECT_EQ(answer["full"], full(text)) << bytes;
    }
}

TEST_F(FullConfiguration, IsLeftOutWithoutGuards) {
    start(Guards::Off);
    translatorPrints(configuration(6201));
    const json answer = getConfiguration();
    EXPECT_EQ(answer.size(), 1U) << answer;
    EXPECT_EQ(answer["rows"][0]["CONTEXT"], configuration(6201).substr(0, kContextBytes));
}

TEST_F(FullConfiguration, KeepsLettersOfSeveralBytes) {
    start(Guards::On);
    std::string text = "INSTANCE=";
    while (text.size() < 100000)
        text += "\xC3\xA4\xE2\x82\xAC\xF0\x9F\x98\x80 ";
    for (const std::string& printed : {std::string("INSTANCE=\xC3\xA4\xC3\xB6\xC3\xBC"), text}) {
        translatorPrints(printed);
        EXPECT_EQ(getConfiguration()["full"], full(printed)) << printed.size();
    }
}

TEST_F(FullConfiguration, ThatHoldsNoTextIsNotComplete) {
    start(Guards::On);
    translatorPrints("INSTANCE=\xFFx");
    EXPECT_EQ(getConfiguration()["full"], full("INSTANCE=\xEF\xBF\xBDx", false));
}

TEST_F(FullConfiguration, ThatIsLongerThanTheHostKeepsIsNotComplete) {
    start(Guards::On);
    const std::size_t kept = std::size_t{4} << 20;
    const std::string text = configuration(kept + 1);
    translatorPrints(text);
    const json answer = getConfiguration();
    EXPECT_TRUE(answer["full"] == full(text.substr(0, kept), false));
    translatorPrints(text.substr(0, kept));
    EXPECT_TRUE(getConfiguration()["full"] == full(text.substr(0, kept)));
}

TEST_F(FullConfiguration, WithoutOneIsEmptyAsTheRowIs) {
    start(Guards::On);
    translatorPrints("nothing of the kind\n");
    const json answer = getConfiguration();
    EXPECT_EQ(answer["rows"][0]["CONTEXT"], "");
    EXPECT_EQ(answer["full"], full(""));
}

TEST_F(FullConfiguration, IsThereOnlyWhenThereIsOne) {
    start(Guards::On);
    home.products({"ux"}, "echo INSTANCE=x; exit 3");
    EXPECT_FALSE(getConfiguration().contains("full")) << "the command failed";
    EXPECT_FALSE(query(R"({"table":"KAGREQT"})").contains("full"));
    EXPECT_FALSE(query(R"({"table":"KINAGT"})").contains("full"));
}

class InventoryWarning : public AnswersOfTheHost {
protected:
    json inventory() const { return query(R"({"table":"KINAGT"})"); }
    std::string program() const { return home.path() + "/bin/cinfo"; }
    /// The warning, which must be the only one, and begin as they all do.
    json warning(const json& answer) const {
        EXPECT_TRUE(answer.contains("warnings")) << answer;
        if (!answer.contains("warnings") || answer["warnings"].size() != 1) return {};
        return answer["warnings"][0];
    }
    static std::string text(const std::string& reason) {
        return "what is installed is not known, because the inventory program failed: " + reason;
    }
};

TEST_F(InventoryWarning, TellsTheFailedProgramWithItsOutput) {
    start(Guards::On);
    home.files().script("home/bin/cinfo", "echo half; echo no licence >&2; exit 7");
    const json answer = inventory();
    EXPECT_EQ(answer["rows"], json::array());
    const json command = warning(answer);
    EXPECT_EQ(command["text"], text("it ended with status 7"));
    EXPECT_EQ(command["command"], program() + " -d");
    EXPECT_EQ(command["exit"], 7);
    EXPECT_EQ(command["stdout"], "half\n");
    EXPECT_EQ(command["stderr"], "no licence\n");
}

TEST_F(InventoryWarning, KnowsEveryWayToFail) {
    start(Guards::On);
    ASSERT_EQ(::unlink(program().c_str()), 0);
    EXPECT_EQ(warning(inventory())["text"], text(program() + ": No such file or directory"));
    home.files().script("home/bin/cinfo", "kill -9 $$");
    EXPECT_EQ(warning(inventory())["text"], text("it was ended by signal 9"));
    if (kVforkSharesMemory) {
        home.files().write("home/bin/cinfo", "#!/no/such/interpreter\n", 0755);
        EXPECT_EQ(warning(inventory())["text"],
                  text("cannot be executed: No such file or directory"));
    }
    home.files().script("home/bin/cinfo", "echo something else");
    EXPECT_EQ(warning(inventory())["text"], text("it did not print an inventory"));
}

TEST_F(InventoryWarning, IsLeftOutWithoutGuards) {
    home.files().script("home/bin/cinfo", "exit 7");
    start(Guards::Off);
    EXPECT_EQ(inventory().dump(), R"({"rows":[]})");
}

TEST_F(InventoryWarning, IsNoneWhenNothingIsInstalled) {
    start(Guards::On);
    home.files().script("home/bin/cinfo",
                        "echo '\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"'");
    EXPECT_EQ(inventory().dump(), R"({"rows":[]})");
    home.products({"ux"}, "exit 0");
    EXPECT_EQ(inventory()["rows"].size(), 3U);
    EXPECT_EQ(inventory().size(), 1U);
}

}  // namespace
