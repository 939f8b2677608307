// ctest-label: threaded
#include "tables/zav03agt.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "support/row_text.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "tables/table_checks.h"
#include "tasks/home.h"
#include "tasks/zavtqelm.h"

namespace {

using Texts = std::vector<std::string>;
using Made = MadeRequest<zav_kinagt_manager, zav_kinagt_agent>;

const std::string kHeader = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";

const std::vector<ExpectedColumn> kColumns = {
    {"ORIGINNODE", "originnode", 0, 64, 9}, {"TOVRINHOME", "tovrinhome", 64, 512, 9},
    {"HOSTTYPE", "hosttype", 576, 5, 9},    {"HOSTPC", "hostpc", 581, 10, 9},
    {"PRODUCT", "product", 591, 32, 9},     {"VERSION", "version", 623, 12, 9},
    {"PRODDESC", "proddesc", 635, 80, 9},   {"RELEASE", "release", 715, 12, 9},
    {"PLATFORM", "platform", 727, 20, 9},
};

// ---- Schema -------------------------------------------------------------------------------------

TEST(InstalledTableSchema, DescribesItsColumns) {
    Made request("KINAGT");
    expectColumns(*request, kColumns);
    expectColumnBounds(*request);
}

TEST(InstalledTableSchema, ComparesColumnsByTheirAttributeNames) {
    Made request("KINAGT");
    expectComparisons(*request, 747, kColumns);
}

TEST(InstalledTableSchema, KeepsTheFrameworksOrderOfVirtualFunctions) {
    expectRequestSlots<zav_kinagt_base, zav_kinagt_agent>();
    expectManagerSlots<zav_kinagt_manager>();
}

TEST(InstalledTableSchema, AccessorsPointIntoTheRow) {
    Made request("KINAGT");
    zav_kinagt_data_t rows[2];
    std::memset(rows, ' ', sizeof rows);
    ASSERT_EQ(request->AddData(rows, 2), 0);
    char* const base = request->Data(1);
    EXPECT_EQ(request->_get_value_originnode(1), base + 0);
    EXPECT_EQ(request->_get_value_tovrinhome(1), base + 64);
    EXPECT_EQ(request->_get_value_hosttype(1), base + 576);
    EXPECT_EQ(request->_get_value_hostpc(1), base + 581);
    EXPECT_EQ(request->_get_value_product(1), base + 591);
    EXPECT_EQ(request->_get_value_version(1), base + 623);
    EXPECT_EQ(request->_get_value_proddesc(1), base + 635);
    EXPECT_EQ(request->_get_value_release(1), base + 715);
    EXPECT_EQ(request->_get_value_platform(1), base + 727);
}

TEST(InstalledTableSchema, PrintsItselfAndItsRows) {
    Made request("KINAGT");
    zav_kinagt_data_t row;
    std::memset(&row, ' ', sizeof row);
    std::memcpy(row.hosttype, "Linux", 5);
    std::memcpy(row.hostpc, "lx8266xxyy", 10);
    request->AddData(&row, 1);
    TraceCapture trace;
    request->PrintSelf();
    char head[100];
    std::snprintf(head, sizeof head, "zav_kinagt_base @%p <%u,%u>",
                  static_cast<const void*>(&*request), request->ObjectNumber(),
                  request->UseCount());
    const Texts expected = {
        head,
        "\t::appl=ZAV,table=KINAGT,interval=0,samptype=0",
        "\t_data {",
        "\t\tcount=1, allocated=1, allocSize=1",
        "\t\t{",
        "\t\toriginnode=\"" + padded("", 64) + "\"",
        "\t\ttovrinhome=\"" + padded("", 512) + "\"",
        "\t\thosttype=\"Linux\"",
        "\t\thostpc=\"lx8266xxyy\"",
        "\t\tproduct=\"" + padded("", 32) + "\"",
        "\t\tversion=\"" + padded("", 12) + "\"",
        "\t\tproddesc=\"" + padded("", 80) + "\"",
        "\t\trelease=\"" + padded("", 12) + "\"",
        "\t\tplatform=\"" + padded("", 20) + "\"",
        "\t\t}",
        "\t}",
    };
    EXPECT_EQ(trace.details("zav03agt"), expected);
}

// ---- Samples ------------------------------------------------------------------------------------

class InstalledTable : public testing::Test {
protected:
    InstalledTable() : home_(scratch_.path("home")) {
        oxa::setOriginNode("this-node");
        ZAV_TOVRINHOME = home_.c_str();
        zav_kinagt_init();
        probe("os=Linux\ncArch=lx8266\necho ignored\n");
    }
    ~InstalledTable() override { ZAV_TOVRINHOME = nullptr; }

    void probe(const std::string& body) {
        scratch_.write("home/bin/dynarch.shl", body);
        scratch_.write("home/registry/archdsc.tbl", "");
    }
    void inventory(const std::string& lines) {
        scratch_.write("home/list", kHeader + "\n" + lines);
        scratch_.script("home/bin/cinfo", "[ \"$*\" = -d ] && cat '" + home_ + "/list'\n");
    }

    static int sample(std::vector<zav_kinagt_data_t>& found,
                      const std::vector<oxa::Predicate>& where = {}) {
        oxa::Rows rows;
        const int status = oxa::query("KINAGT", where, rows);
        found.resize(rows.count());
        if (!found.empty()) std::memcpy(found.data(), rows.bytes.data(), rows.bytes.size());
        return status;
    }
    static std::vector<zav_kinagt_data_t> rows(const std::vector<oxa::Predicate>& where = {}) {
        std::vector<zav_kinagt_data_t> found;
        EXPECT_EQ(sample(found, where), 0);
        return found;
    }

    ScratchDir scratch_;
    const std::string home_;
};

TEST_F(InstalledTable, IsRegisteredUnderItsNames) {
    EXPECT_STREQ(zav_kinagt_application, "ZAV");
    EXPECT_STREQ(zav_kinagt_table, "KINAGT");
    EXPECT_STREQ(zav_kinagt_static_manager->ApplicationName(), "ZAV");
    EXPECT_STREQ(zav_kinagt_static_manager->TableName(), "KINAGT");
}

TEST_F(InstalledTable, ListsAProductByteForByte) {
    inventory("\"ux\",\"Monitoring Agent\",\"lx8266\",\"06200000\",\"100\"\n");
    const auto found = rows();
    ASSERT_EQ(found.size(), 1u);
    const std::string expected = padded("this-node", 64) + padded(home_, 512) + "Linux" +
                                 padded("lx8266", 10) + padded("ux", 32) + padded("062000000", 12) +
                                 padded("Monitoring Agent", 80) + padded("100", 12) +
                                 padded("lx8266", 20);
    ASSERT_EQ(expected.size(), 747u);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(&found[0]), sizeof found[0]), expected);
}

TEST_F(InstalledTable, RunsTheProbeAndThenTheInventory) {
    inventory("a,b,c,d,e\n");
    TraceCapture trace;
    rows();
    Texts commandLines;
    for (const std::string& line : trace.details()) {
        if (line.compare(0, 15, "Command to run ") == 0) commandLines.push_back(line);
    }
    EXPECT_EQ(commandLines,
              (Texts{"Command to run is \"/bin/ksh -c '. " + home_ + "/bin/dynarch.shl " + home_ +
                         "/registry/archdsc.tbl >/dev/null 2>&1;echo ArchitectureHeader;echo "
                         "$os;echo $cArch'\"",
                     "Command to run is \"" + home_ + "/bin/cinfo -d\""}));
}

TEST_F(InstalledTable, TracesLineByLine) {
    inventory("a,b,c,d,e\na,b,c,d,e\n");
    TraceCapture trace;
    rows();
    EXPECT_EQ(trace.details("zav03agt"),
              (Texts{"$os = Linux, $cArch = lx8266", "Index of inventory header is 0",
                     "Index of newline after inventory header is : 55",
                     "Found product line: a,b,c,d,e", "Passing row 0 to InsertRow().",
                     "Found product line: a,b,c,d,e", "skipping duplicate info in this line"}));
}

TEST_F(InstalledTable, AQueryForOneProductGetsItsRow) {
    inventory("ux,b,c,d,e\nax,b,c,d,e\nuxx,b,c,d,e\n");
    const auto found = rows({{"PRODUCT", OPER_EQ, "ax"}});
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(trimmedField(found[0].product), "ax");
    EXPECT_EQ(rows({{"PRODUCT", OPER_LIKE, "ux*"}}).size(), 2u);
}

TEST_F(InstalledTable, EachSampleAsksAnew) {
    inventory("ux,b,c,d,e\n");
    EXPECT_EQ(rows().size(), 1u);
    inventory("ux,b,c,d,e\nax,b,c,d,e\n");
    EXPECT_EQ(rows().size(), 2u);
    inventory("");
    EXPECT_EQ(rows().size(), 0u);
}

TEST_F(InstalledTable, ValuesThatAreTooLongAreCut) {
    const std::string longer(100, 'x');
    inventory(longer + "," + longer + "," + longer + "," + longer + "," + longer + "\n");
    probe("os=SomeSystem\ncArch=architecture\n");
    TraceCapture trace;
    const auto found = rows();
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(fieldText(found[0].hosttype), "SomeS");
    EXPECT_EQ(fieldText(found[0].hostpc), "architectu");
    EXPECT_EQ(fieldText(found[0].product), std::string(32, 'x'));
    EXPECT_EQ(fieldText(found[0].version), std::string(12, 'x'));
    EXPECT_EQ(fieldText(found[0].proddesc), std::string(80, 'x'));
    EXPECT_EQ(fieldText(found[0].release), std::string(12, 'x'));
    EXPECT_EQ(fieldText(found[0].platform), std::string(20, 'x'));
    const std::string before = "exceeded the maximum size of ";
    Texts widths;  // in the order of writing
    for (const std::string& line : trace.errors("zavtqelm")) {
        const std::size_t at = line.find(before) + before.size();
        widths.push_back(line.substr(at, line.find(' ', at) - at));
    }
    EXPECT_EQ(widths, (Texts{"5", "10", "32", "80", "20", "12", "12"}));
}

TEST_F(InstalledTable, AShorterProductLeavesNothingOfTheOneBefore) {
    inventory("longcode,long description,longplatform,longversion,longrelease\na,b,c,d,e\n");
    const auto found = rows();
    ASSERT_EQ(found.size(), 2u);
    EXPECT_EQ(fieldText(found[1].product), padded("a", 32));
    EXPECT_EQ(fieldText(found[1].proddesc), padded("b", 80));
    EXPECT_EQ(fieldText(found[1].platform), padded("c", 20));
    EXPECT_EQ(fieldText(found[1].version), padded("d", 12));
    EXPECT_EQ(fieldText(found[1].release), padded("e", 12));
}

// ---- Failures -----------------------------------------------------------------------------------

class FailingProbe : public InstalledTable {
protected:
    void expectBlankArchitecture() {
        inventory("ux,b,c,d,e\n");
        const auto found = rows();
        ASSERT_EQ(found.size(), 1u);
        EXPECT_EQ(fieldText(found[0].hosttype), padded("", 5));
        EXPECT_EQ(fieldText(found[0].hostpc), padded("", 10));
        EXPECT_EQ(trimmedField(found[0].product), "ux");
    }
};

TEST_F(FailingProbe, ThatIsMissingLeavesTheArchitectureBlank) {
    ::unlink((home_ + "/bin/dynarch.shl").c_str());
    expectBlankArchitecture();
}

TEST_F(FailingProbe, ThatEndsTheShellLeavesTheArchitectureBlank) {
    probe("exit 3\n");
    expectBlankArchitecture();
}

TEST_F(FailingProbe, ThatNamesNoArchitectureLeavesItBlank) {
    probe("os=Linux\n");
    TraceCapture trace;
    expectBlankArchitecture();
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Expected 3 tokens, Header and $os and $cArch, but we got 2 tokens",
                     "Received token ***ArchitectureHeader***", "Received token ***Linux***"}));
}

TEST_F(FailingProbe, ThatNamesTooMuchLeavesTheArchitectureBlank) {
    probe("IFS=\nos='a\nb'\ncArch=c\n");  // without field separators the echo keeps the newline
    TraceCapture trace;
    expectBlankArchitecture();
    EXPECT_EQ(trace.errors("zav03agt").size(), 5u);
}

TEST_F(FailingProbe, ThatTimesOutLeavesTheArchitectureBlank) {
    const ScopedEnv timeout("TIMEOUT", "1");
    probe("sleep 60\n");
    expectBlankArchitecture();
}

TEST_F(InstalledTable, WithoutTheInventoryProgramThereAreNoRows) {
    EXPECT_TRUE(rows().empty());
}

TEST_F(InstalledTable, WithAnInventoryThatIsNotExecutableThereAreNoRows) {
    scratch_.write("home/bin/cinfo", "#!/bin/sh\n", 0644);
    EXPECT_TRUE(rows().empty());
}

TEST_F(InstalledTable, WithAFailingInventoryThereAreNoRows) {
    inventory("a,b,c,d,e\n");
    scratch_.script("home/bin/cinfo", "cat '" + home_ + "/list'; exit 1\n");
    EXPECT_TRUE(rows().empty());
}

TEST_F(InstalledTable, WithAnInventoryThatTimesOutThereAreNoRows) {
    const ScopedEnv timeout("TIMEOUT", "1");
    scratch_.script("home/bin/cinfo", "sleep 60\n");
    EXPECT_TRUE(rows().empty());
}

TEST_F(InstalledTable, WithAnInventoryThatPrintsNothingThereAreNoRows) {
    scratch_.script("home/bin/cinfo", "exit 0\n");
    TraceCapture trace;
    EXPECT_TRUE(rows().empty());
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Inventory header string " + kHeader + ", not found"}));
}

TEST_F(InstalledTable, WithAnEmptyInventoryThereAreNoRows) {
    inventory("");
    EXPECT_TRUE(rows().empty());
}

TEST_F(InstalledTable, ALineWithFourFieldsIsPassedOver) {
    inventory("a,b,c,d,e\na,b,c,d\nf,g,h,i,j\n");
    TraceCapture trace;
    EXPECT_EQ(rows().size(), 2u);
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Product line has 4 fields, expecting 5 fields.  Product line is: a,b,c,d"}));
}

TEST_F(InstalledTable, TwoIdenticalLinesAreOneRow) {
    inventory("a,b,c,d,e\na,b,c,d,e\n");
    EXPECT_EQ(rows().size(), 1u);
}

// ---- Many lines, many queries -------------------------------------------------------------------

TEST_F(InstalledTable, ThousandsOfProductsAreListed) {
    std::string lines;
    for (int i = 0; i < 5000; ++i) {
        lines += "\"p" + std::to_string(i) + "\",\"Agent\",\"lx8266\",\"06200000\",\"100\"\n";
    }
    inventory(lines);
    const auto found = rows();
    ASSERT_EQ(found.size(), 5000u);
    EXPECT_EQ(trimmedField(found.front().product), "p0");
    EXPECT_EQ(trimmedField(found.back().product), "p4999");
}

TEST_F(InstalledTable, QueriesDoNotDisturbEachOther) {
    inventory("ux,b,c,d,e\nax,b,c,d,e\n");
    std::vector<std::thread> queries;
    for (int i = 0; i < 4; ++i) {
        queries.emplace_back([] {
            for (int n = 0; n < 5; ++n)
                EXPECT_EQ(rows().size(), 2u);
        });
    }
    for (std::thread& query : queries)
        query.join();
}

// ---- Events -------------------------------------------------------------------------------------

TEST_F(InstalledTable, EventsReachSubscribers) {
    std::size_t delivered = 0;
    const auto subscription = oxa::subscribe("KINAGT", {{"PRODUCT", OPER_EQ, "ux"}},
                                             [&delivered](const oxa::Rows& given) {
                                                 delivered += given.count();
                                                 return 0;
                                             });
    zav_kinagt_data_t given[2];
    std::memset(given, ' ', sizeof given);
    std::memcpy(given[1].product, "ux", 2);
    EXPECT_EQ(zav_kinagt_manager::EventArrived(given, 2), 0);
    EXPECT_EQ(delivered, 1u);
}

TEST_F(InstalledTable, EventsWithoutManagerAreLost) {
    zav_kinagt_manager* const kept = std::exchange(zav_kinagt_static_manager, nullptr);
    zav_kinagt_data_t given{};
    EXPECT_EQ(zav_kinagt_manager::EventArrived(&given, 1), 0);
    zav_kinagt_static_manager = kept;
}

}  // namespace
