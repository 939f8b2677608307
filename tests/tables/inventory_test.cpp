#include "tables/inventory.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/trace_capture.h"

using ZAV::String;

namespace {

using Texts = std::vector<std::string>;

const std::string kHeader = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";

std::string narrow(const String& text) {
    return static_cast<const char*>(text.c_str());
}

/// The products, each as its fields joined by "|".
Texts productsOf(const std::string& inventory) {
    Texts found;
    EXPECT_EQ(forEachProduct(inventory.c_str(),
                             [&found](const InstalledProduct& product) {
                                 found.push_back(
                                     narrow(product.code) + "|" + narrow(product.description) +
                                     "|" + narrow(product.platform) + "|" +
                                     narrow(product.version) + "|" + narrow(product.release));
                                 return 0;
                             }),
              0);
    return found;
}

Texts productsOfLines(const std::string& lines) {
    return productsOf("*** noise\n" + kHeader + "\n" + lines);
}

// ---- The architecture probe ---------------------------------------------------------------------

TEST(ArchitectureProbe, HasThisCommandLine) {
    EXPECT_EQ(
        narrow(architectureProbeCommand("/opt/tovrin")),
        "/bin/ksh -c '. /opt/tovrin/bin/dynarch.shl /opt/tovrin/registry/archdsc.tbl >/dev/null "
        "2>&1;echo ArchitectureHeader;echo $os;echo $cArch'");
}

TEST(ArchitectureProbe, YieldsSystemAndArchitecture) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("noise\nArchitectureHeader\nLinux\nlx8\n");
    EXPECT_EQ(narrow(host.os), "Linux");
    EXPECT_EQ(narrow(host.architecture), "lx8");
    EXPECT_EQ(trace.details("zav03agt"), (Texts{"$os = Linux, $cArch = lx8"}));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(ArchitectureProbe, WithoutItsHeaderYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("Linux\nlx8\n");
    EXPECT_EQ(host.os.length(), 0u);
    EXPECT_EQ(host.architecture.length(), 0u);
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Could not find header ArchitectureHeader in output"}));
}

TEST(ArchitectureProbe, WithoutAnyOutputYieldsNothing) {
    TraceCapture trace;
    EXPECT_EQ(parseArchitectureProbe("").os.length(), 0u);
    EXPECT_EQ(trace.errors("zav03agt").size(), 1u);
}

TEST(ArchitectureProbe, ThatPrintsTooLittleYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("ArchitectureHeader\n\nlx8\n");
    EXPECT_EQ(host.os.length(), 0u);
    EXPECT_EQ(host.architecture.length(), 0u);
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Expected 3 tokens, Header and $os and $cArch, but we got 2 tokens",
                     "Received token ***ArchitectureHeader***", "Received token ***lx8***"}));
}

TEST(ArchitectureProbe, ThatPrintsTooMuchYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host =
        parseArchitectureProbe("x ArchitectureHeader\nLinux\nlx8\nmore\n");
    EXPECT_EQ(host.os.length(), 0u);
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Expected 3 tokens, Header and $os and $cArch, but we got 4 tokens",
                     "Received token ***ArchitectureHeader***", "Received token ***Linux***",
                     "Received token ***lx8***", "Received token ***more***"}));
}

// ---- The inventory ------------------------------------------------------------------------------

TEST(Inventory, HasThisCommandLine) {
    EXPECT_EQ(narrow(inventoryCommand("/opt/tovrin")), "/opt/tovrin/bin/cinfo -d");
}

TEST(Inventory, ListsItsProductsInOrder) {
    TraceCapture trace;
    EXPECT_EQ(
        productsOfLines("\"ux\",\"Monitoring Agent\",\"lx8266\",\"062000000\",\"100\"\n"
                        "\"ax\",\"Shared\",\"lx8266\",\"062000001\",\"101\"\n"),
        (Texts{"ux|Monitoring Agent|lx8266|062000000|100", "ax|Shared|lx8266|062000001|101"}));
    EXPECT_EQ(
        trace.details("zav03agt"),
        (Texts{"Index of inventory header is 10", "Index of newline after inventory header is : 65",
               "Found product line: "
               "\"ux\",\"Monitoring Agent\",\"lx8266\",\"062000000\",\"100\"",
               "Found product line: \"ax\",\"Shared\",\"lx8266\",\"062000001\",\"101\""}));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, MayBeEmpty) {
    TraceCapture trace;
    EXPECT_EQ(productsOfLines(""), Texts{});
    EXPECT_EQ(productsOfLines("\n\n\n"), Texts{});
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, WithoutItsHeaderHasNoProducts) {
    TraceCapture trace;
    EXPECT_EQ(productsOf("\"ux\",\"Agent\",\"lx8266\",\"062000000\",\"100\"\n"), Texts{});
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Inventory header string " + kHeader + ", not found"}));
    EXPECT_TRUE(trace.details("zav03agt").empty());
}

TEST(Inventory, WithoutANewlineAfterItsHeaderHasNoProducts) {
    TraceCapture trace;
    EXPECT_EQ(productsOf(kHeader + " and no more"), Texts{});
    const Texts errors = trace.errors("zav03agt");
    ASSERT_EQ(errors.size(), 1u);
    EXPECT_EQ(errors[0], "No newline character '\n' found after Inventory header");
    EXPECT_EQ(trace.details("zav03agt"), (Texts{"Index of inventory header is 0"}));
}

TEST(Inventory, PassesOverLinesWithTooFewFields) {
    TraceCapture trace;
    EXPECT_EQ(
        productsOfLines("a,b,c,d,e\n\"a\",\"b\",\"c\",\"d\"\n\"a\",\"\",\"c\",\"d\",\"e\"\nx\n"
                        "f,g,h,i,j\n"),
        (Texts{"a|b|c|d|e", "f|g|h|i|j"}));
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Product line has 4 fields, expecting 5 fields.  Product line is: "
                     "\"a\",\"b\",\"c\",\"d\"",
                     "Product line has 4 fields, expecting 5 fields.  Product line is: "
                     "\"a\",\"\",\"c\",\"d\",\"e\"",
                     "Product line has 1 fields, expecting 5 fields.  Product line is: x"}));
}

TEST(Inventory, ALineOfDelimitersHasNoFields) {
    TraceCapture trace;
    EXPECT_EQ(productsOfLines("\"\",\"\"\r\n"), Texts{});
    EXPECT_EQ(trace.errors("zav03agt"),
              (Texts{"Product line has 0 fields, expecting 5 fields.  Product line is: "
                     "\"\",\"\"\r"}));
}

TEST(Inventory, ACommaInADescriptionShiftsTheFieldsBehindIt) {
    TraceCapture trace;
    EXPECT_EQ(productsOfLines("\"ux\",\"Agent, with comma\",\"lx8266\",\"062000000\",\"100\"\n"),
              (Texts{"ux|Agent| with comma|lx8266|062000000"}));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, LinesMayEndInCarriageReturnsOrNotAtAll) {
    EXPECT_EQ(productsOfLines("a,b,c,d,e\r\nf,g,h,i,j"), (Texts{"a|b|c|d|e", "f|g|h|i|j"}));
}

TEST(Inventory, VersionsOfEightCharactersGetAZero) {
    EXPECT_EQ(productsOfLines("a,b,c,abcdefg,e\na,b,c,abcdefgh,e\na,b,c,abcdefghi,e\na,b,c,x,e\n"),
              (Texts{"a|b|c|abcdefg|e", "a|b|c|abcdef0gh|e", "a|b|c|abcdefghi|e", "a|b|c|x|e"}));
}

TEST(Inventory, IdenticalLinesAreOneProduct) {
    TraceCapture trace;
    EXPECT_EQ(productsOfLines("a,b,c,d,e\na,b,c,d,e\na,b,c,d,f\n\"a\",\"b\",\"c\",\"d\",\"e\"\n"),
              (Texts{"a|b|c|d|e", "a|b|c|d|f"}));
    EXPECT_EQ(trace.count('D', "skipping duplicate info in this line"), 2);
}

TEST(Inventory, DuplicatesAreFoundByTheVersionAsItIsShown) {
    EXPECT_EQ(productsOfLines("a,b,c,abcdefgh,e\na,b,c,abcdef0gh,e\n"),
              (Texts{"a|b|c|abcdef0gh|e"}));
}

TEST(Inventory, DuplicatesAreFoundByTheFieldsOneBehindTheOther) {
    EXPECT_EQ(productsOfLines("ab,c,d,e,f\na,bc,d,e,f\n"), (Texts{"ab|c|d|e|f"}));
}

TEST(Inventory, FurtherFieldsDoNotCount) {
    EXPECT_EQ(productsOfLines("a,b,c,d,e,f\na,b,c,d,e,g,h\n"), (Texts{"a|b|c|d|e"}));
}

TEST(Inventory, EndsWithTheFirstRefusal) {
    int taken = 0;
    const std::string text = kHeader + "\na,b,c,d,1\na,b,c,d,2\na,b,c,d,3\n";
    EXPECT_EQ(forEachProduct(text.c_str(),
                             [&taken](const InstalledProduct&) { return ++taken == 2 ? 42 : 0; }),
              42);
    EXPECT_EQ(taken, 2);
}

}  // namespace
