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
    EXPECT_EQ(0, forEachProduct(inventory.c_str(), [&found](const InstalledProduct& product) {
                  found.push_back(narrow(product.code) + "|" + narrow(product.description) + "|" +
                                  narrow(product.platform) + "|" + narrow(product.version) + "|" +
                                  narrow(product.release));
                  return 0;
              }));
    return found;
}

Texts productsOfLines(const std::string& lines) {
    return productsOf("*** noise\n" + kHeader + "\n" + lines);
}

// ---- The architecture probe ---------------------------------------------------------------------

TEST(ArchitectureProbe, HasThisCommandLine) {
    EXPECT_EQ(
        "/bin/ksh -c '. /opt/tovrin/bin/dynarch.shl /opt/tovrin/registry/archdsc.tbl >/dev/null "
        "2>&1;echo ArchitectureHeader;echo $os;echo $cArch'",
        narrow(architectureProbeCommand("/opt/tovrin")));
}

TEST(ArchitectureProbe, YieldsSystemAndArchitecture) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("noise\nArchitectureHeader\nLinux\nlx8\n");
    EXPECT_EQ("Linux", narrow(host.os));
    EXPECT_EQ("lx8", narrow(host.architecture));
    EXPECT_EQ((Texts{"$os = Linux, $cArch = lx8"}), trace.details("zav03agt"));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(ArchitectureProbe, WithoutItsHeaderYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("Linux\nlx8\n");
    EXPECT_EQ(0u, host.os.length());
    EXPECT_EQ(0u, host.architecture.length());
    EXPECT_EQ((Texts{"Could not find header ArchitectureHeader in output"}),
              trace.errors("zav03agt"));
}

TEST(ArchitectureProbe, WithoutAnyOutputYieldsNothing) {
    TraceCapture trace;
    EXPECT_EQ(0u, parseArchitectureProbe("").os.length());
    EXPECT_EQ(1u, trace.errors("zav03agt").size());
}

TEST(ArchitectureProbe, ThatPrintsTooLittleYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host = parseArchitectureProbe("ArchitectureHeader\n\nlx8\n");
    EXPECT_EQ(0u, host.os.length());
    EXPECT_EQ(0u, host.architecture.length());
    EXPECT_EQ((Texts{"Expected 3 tokens, Header and $os and $cArch, but we got 2 tokens",
                     "Received token ***ArchitectureHeader***", "Received token ***lx8***"}),
              trace.errors("zav03agt"));
}

TEST(ArchitectureProbe, ThatPrintsTooMuchYieldsNothing) {
    TraceCapture trace;
    const HostArchitecture host =
        parseArchitectureProbe("x ArchitectureHeader\nLinux\nlx8\nmore\n");
    EXPECT_EQ(0u, host.os.length());
    EXPECT_EQ((Texts{"Expected 3 tokens, Header and $os and $cArch, but we got 4 tokens",
                     "Received token ***ArchitectureHeader***", "Received token ***Linux***",
                     "Received token ***lx8***", "Received token ***more***"}),
              trace.errors("zav03agt"));
}

// ---- The inventory ------------------------------------------------------------------------------

TEST(Inventory, HasThisCommandLine) {
    EXPECT_EQ("/opt/tovrin/bin/cinfo -d", narrow(inventoryCommand("/opt/tovrin")));
}

TEST(Inventory, ListsItsProductsInOrder) {
    TraceCapture trace;
    EXPECT_EQ((Texts{"ux|Monitoring Agent|lx8266|062000000|100", "ax|Shared|lx8266|062000001|101"}),
              productsOfLines("\"ux\",\"Monitoring Agent\",\"lx8266\",\"062000000\",\"100\"\n"
                              "\"ax\",\"Shared\",\"lx8266\",\"062000001\",\"101\"\n"));
    EXPECT_EQ(
        (Texts{"Index of inventory header is 10", "Index of newline after inventory header is : 65",
               "Found product line: "
               "\"ux\",\"Monitoring Agent\",\"lx8266\",\"062000000\",\"100\"",
               "Found product line: \"ax\",\"Shared\",\"lx8266\",\"062000001\",\"101\""}),
        trace.details("zav03agt"));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, MayBeEmpty) {
    TraceCapture trace;
    EXPECT_EQ(Texts{}, productsOfLines(""));
    EXPECT_EQ(Texts{}, productsOfLines("\n\n\n"));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, WithoutItsHeaderHasNoProducts) {
    TraceCapture trace;
    EXPECT_EQ(Texts{}, productsOf("\"ux\",\"Agent\",\"lx8266\",\"062000000\",\"100\"\n"));
    EXPECT_EQ((Texts{"Inventory header string " + kHeader + ", not found"}),
              trace.errors("zav03agt"));
    EXPECT_TRUE(trace.details("zav03agt").empty());
}

TEST(Inventory, WithoutANewlineAfterItsHeaderHasNoProducts) {
    TraceCapture trace;
    EXPECT_EQ(Texts{}, productsOf(kHeader + " and no more"));
    const Texts errors = trace.errors("zav03agt");
    ASSERT_EQ(1u, errors.size());
    EXPECT_EQ("No newline character '\n' found after Inventory header", errors[0]);
    EXPECT_EQ((Texts{"Index of inventory header is 0"}), trace.details("zav03agt"));
}

TEST(Inventory, PassesOverLinesWithTooFewFields) {
    TraceCapture trace;
    EXPECT_EQ(
        (Texts{"a|b|c|d|e", "f|g|h|i|j"}),
        productsOfLines("a,b,c,d,e\n\"a\",\"b\",\"c\",\"d\"\n\"a\",\"\",\"c\",\"d\",\"e\"\nx\n"
                        "f,g,h,i,j\n"));
    EXPECT_EQ((Texts{"Product line has 4 fields, expecting 5 fields.  Product line is: "
                     "\"a\",\"b\",\"c\",\"d\"",
                     "Product line has 4 fields, expecting 5 fields.  Product line is: "
                     "\"a\",\"\",\"c\",\"d\",\"e\"",
                     "Product line has 1 fields, expecting 5 fields.  Product line is: x"}),
              trace.errors("zav03agt"));
}

TEST(Inventory, ALineOfDelimitersHasNoFields) {
    TraceCapture trace;
    EXPECT_EQ(Texts{}, productsOfLines("\"\",\"\"\r\n"));
    EXPECT_EQ((Texts{"Product line has 0 fields, expecting 5 fields.  Product line is: "
                     "\"\",\"\"\r"}),
              trace.errors("zav03agt"));
}

TEST(Inventory, ACommaInADescriptionShiftsTheFieldsBehindIt) {
    TraceCapture trace;
    EXPECT_EQ((Texts{"ux|Agent| with comma|lx8266|062000000"}),
              productsOfLines("\"ux\",\"Agent, with comma\",\"lx8266\",\"062000000\",\"100\"\n"));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(Inventory, LinesMayEndInCarriageReturnsOrNotAtAll) {
    EXPECT_EQ((Texts{"a|b|c|d|e", "f|g|h|i|j"}), productsOfLines("a,b,c,d,e\r\nf,g,h,i,j"));
}

TEST(Inventory, VersionsOfEightCharactersGetAZero) {
    EXPECT_EQ((Texts{"a|b|c|abcdefg|e", "a|b|c|abcdef0gh|e", "a|b|c|abcdefghi|e", "a|b|c|x|e"}),
              productsOfLines("a,b,c,abcdefg,e\na,b,c,abcdefgh,e\na,b,c,abcdefghi,e\na,b,c,x,e\n"));
}

TEST(Inventory, IdenticalLinesAreOneProduct) {
    TraceCapture trace;
    EXPECT_EQ((Texts{"a|b|c|d|e", "a|b|c|d|f"}),
              productsOfLines("a,b,c,d,e\na,b,c,d,e\na,b,c,d,f\n\"a\",\"b\",\"c\",\"d\",\"e\"\n"));
    EXPECT_EQ(2, trace.count('D', "skipping duplicate info in this line"));
}

TEST(Inventory, DuplicatesAreFoundByTheVersionAsItIsShown) {
    EXPECT_EQ((Texts{"a|b|c|abcdef0gh|e"}),
              productsOfLines("a,b,c,abcdefgh,e\na,b,c,abcdef0gh,e\n"));
}

TEST(Inventory, DuplicatesAreFoundByTheFieldsOneBehindTheOther) {
    EXPECT_EQ((Texts{"ab|c|d|e|f"}), productsOfLines("ab,c,d,e,f\na,bc,d,e,f\n"));
}

TEST(Inventory, FurtherFieldsDoNotCount) {
    EXPECT_EQ((Texts{"a|b|c|d|e"}), productsOfLines("a,b,c,d,e,f\na,b,c,d,e,g,h\n"));
}

TEST(Inventory, EndsWithTheFirstRefusal) {
    int taken = 0;
    const std::string text = kHeader + "\na,b,c,d,1\na,b,c,d,2\na,b,c,d,3\n";
    EXPECT_EQ(42, forEachProduct(text.c_str(), [&taken](const InstalledProduct&) {
                  return ++taken == 2 ? 42 : 0;
              }));
    EXPECT_EQ(2, taken);
}

}  // namespace
