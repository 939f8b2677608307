#include "tasks/product_arch.h"

#include <gmock/gmock.h>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using ZAV::String;

namespace {

constexpr const char* kListHeader =
    "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";

class ProductArch : public testing::Test {
protected:
    std::string arch(const char* product) { return narrow(getProductArch(product)); }
    std::string shared(const char* product, const char* preferred = "") {
        return narrow(getSharedLibArch(product, preferred));
    }
    static std::string header() { return TaskHome::listHeader(); }
    static std::string line(const std::string& product, const std::string& platform) {
        return TaskHome::listLine(product, platform);
    }
    /// The command lines that were run.
    std::vector<std::string> commands() const {
        const std::string begin = "Command to run is \"";
        std::vector<std::string> found;
        for (const std::string& text : trace_.details()) {
            if (text.compare(0, begin.size(), begin) == 0) {
                found.push_back(text.substr(begin.size(), text.size() - begin.size() - 1));
            }
        }
        return found;
    }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL) (UNIT:zavutil ALL)"};
};

// ---- The report about one product ---------------------------------------------------------------

TEST_F(ProductArch, IsTheFirstWordOfTheProductsLine) {
    home_.inventory("",
                    "some text\nPlatform codes:\nli6263 Product (lz)\n\nli6243: Product :(ux)\n"
                    "aix523 Product (ux)\n");
    EXPECT_EQ(arch("ux"), "li6243");
    EXPECT_THAT(commands(), ElementsAre(home_.home() + "/bin/cinfo -p ux"));
    EXPECT_THAT(trace_.details("zavtasks"),
                ElementsAre("Looking for product code ux", "Index of inventory header is 10",
                            "Index of newline after product header is : 25",
                            "Found product line: li6263 Product (lz)",
                            "Found product line: li6243: Product :(ux)",
                            "Architecture for product code [ux] is [li6243]"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(ProductArch, IsNotFoundInLinesOfAnotherForm) {
    home_.inventory("",
                    "Platform codes: li1 Product (ux)\nli2 Product ux\nli3 product (ux)\n"
                    "li4 Product (ux) more\nProduct (ux)\nli5 Product (UX)\n(ux)\n   :\n");
    EXPECT_EQ(arch("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
    EXPECT_EQ(trace_.count('D', "Architecture for product code [ux] is []"), 1);
}

TEST_F(ProductArch, NeedsTheReportsHeader) {
    for (const char* report : {"", "\n", "\n\n\n", "li6263 Product (ux)\n"}) {
        trace_.clear();
        home_.inventory("", report);
        EXPECT_EQ(arch("ux"), "") << report;
        EXPECT_THAT(trace_.errors("zavtasks"),
                    ElementsAre("Product header string Platform codes:, not found"));
    }
}

TEST_F(ProductArch, NeedsANewlineBehindTheReportsHeader) {
    home_.inventory("", "\nPlatform codes: li6263 Product (ux)");
    EXPECT_EQ(arch("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("No newline character '\n' found after Product header"));
}

TEST_F(ProductArch, MayHaveNoLinesToLookAt) {
    home_.inventory("", "Platform codes:\n");
    EXPECT_EQ(arch("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
}

TEST_F(ProductArch, FailedReportsAreNotTraced) {
    EXPECT_EQ(arch("ux"), "");
    home_.notExecutable("bin/cinfo");
    EXPECT_EQ(arch("ux"), "");
    home_.program("bin/cinfo", "echo 'Platform codes:\nli6263 Product (ux)'; exit 3");
    EXPECT_EQ(arch("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
    EXPECT_EQ(trace_.count('D', "Architecture for product code [ux] is []"), 3);
}

TEST_F(ProductArch, ReportsThatTakeTooLongAreFailures) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.program("bin/cinfo", "exec sleep 20");
    EXPECT_EQ(arch("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
}

// ---- The list of all products -------------------------------------------------------------------

TEST_F(ProductArch, IsThatOfTheFirstLineWithoutAPreference) {
    home_.inventory("noise\n" + header() + line("lz", "li6263") + line("ux", "li6243") +
                    line("ux", "aix523"));
    EXPECT_EQ(shared("ux"), "li6243");
    EXPECT_THAT(commands(), ElementsAre(home_.home() + "/bin/cinfo -d "));
    EXPECT_THAT(
        trace_.details("zavtasks"),
        ElementsAre("Looking for product code ux", "Index of inventory header is 6",
                    "Index of newline after inventory header is : 61",
                    "Found product line: \"lz\",\"A product\",\"li6263\",\"06010000\",\"100\"",
                    "Found product line: \"ux\",\"A product\",\"li6243\",\"06010000\",\"100\"",
                    "Architecture for product code [ux] is [li6243]"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(ProductArch, PrefersAPlatformThatEndsAlike) {
    home_.inventory(header() + line("ax", "aix523") + line("ax", "li6243") + line("ax", "li6263"));
    EXPECT_EQ(shared("ax", "li6243"), "li6243");
    EXPECT_EQ(shared("ax", "xy9943"), "li6243");
}

TEST_F(ProductArch, IsThatOfTheLastLineWhenNoneEndsAlike) {
    home_.inventory(header() + line("ax", "aix523") + line("ax", "li6263"));
    EXPECT_EQ(shared("ax", "li6243"), "li6263");
    EXPECT_EQ(shared("ax", "li62433"), "li6263");
    EXPECT_EQ(shared("ax", "li624x"), "li6263");
    EXPECT_EQ(shared("ax", "3"), "li6263");
}

TEST_F(ProductArch, PlatformsOfOneCharacterHaveNoEndsToCompare) {
    home_.inventory(header() + line("ax", "3") + line("ax", "li6263"));
    EXPECT_EQ(shared("ax", "3"), "li6263");
}

TEST_F(ProductArch, SixPlatformsAreNeverTakenForTheSharedComponent) {
    std::string list = header();
    for (const char* platform : {"aix433", "hp102", "sol273", "sol276", "sol278", "sol288"}) {
        list += line("ax", platform) + line("ux", platform);
    }
    home_.inventory(list);
    EXPECT_EQ(shared("ax"), "");
    EXPECT_EQ(shared("ax", "sol288"), "");
    EXPECT_EQ(shared("ux"), "aix433");
    EXPECT_EQ(shared("ux", "xol288"), "sol288");
    home_.inventory(list + line("ax", "li6263") + line("ax", "sol288"));
    EXPECT_EQ(shared("ax"), "li6263");
    EXPECT_EQ(shared("ax", "sol288"), "li6263");
}

TEST_F(ProductArch, LinesOfAnotherLengthAreSkipped) {
    home_.inventory(header() + "\"ux\",\"One, two\",\"li1\",\"06\",\"1\"\n" +
                    "\"ux\",\"li2\"\n\r\n" + "\"ux\",\"\",\"li3\",\"06\",\"1\"\n" +
                    line("ux", "li6263"));
    EXPECT_EQ(shared("ux"), "li6263");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Product line has 6 fields, expecting 5 fields.  Product line is: "
                            "\"ux\",\"One, two\",\"li1\",\"06\",\"1\"",
                            "Product line has 2 fields, expecting 5 fields.  Product line is: "
                            "\"ux\",\"li2\"",
                            "Product line has 0 fields, expecting 5 fields.  Product line is: \r",
                            "Product line has 4 fields, expecting 5 fields.  Product line is: "
                            "\"ux\",\"\",\"li3\",\"06\",\"1\""));
}

TEST_F(ProductArch, LinesMayEndInCarriageReturnsOrWithoutANewline) {
    home_.inventory(std::string(kListHeader) + "\r\n\"ux\",\"A\",\"li6263\",\"06\",\"1\"\r\n" +
                    "\"lz\",\"A\",\"li6243\",\"06\",\"1\"");
    EXPECT_EQ(shared("ux"), "li6263");
    EXPECT_EQ(shared("lz"), "li6243");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
}

TEST_F(ProductArch, OfAProductThatIsNotListedIsEmpty) {
    home_.inventory(header() + line("uxx", "li6263") + line("UX", "li6263"));
    EXPECT_EQ(shared("ux"), "");
    home_.inventory(header());
    EXPECT_EQ(shared("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), IsEmpty());
}

TEST_F(ProductArch, NeedsTheListsHeader) {
    for (const std::string& list : {std::string(), std::string("\n\n"), line("ux", "li6263")}) {
        trace_.clear();
        home_.inventory(list);
        EXPECT_EQ(shared("ux"), "") << list;
        EXPECT_THAT(
            trace_.errors("zavtasks"),
            ElementsAre("Inventory header string " + std::string(kListHeader) + ", not found"));
    }
}

TEST_F(ProductArch, NeedsANewlineBehindTheListsHeader) {
    home_.inventory(kListHeader);
    EXPECT_EQ(shared("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("No newline character '\n' found after Inventory header"));
}

TEST_F(ProductArch, FailedListsAreTraced) {
    EXPECT_EQ(shared("ux"), "");
    home_.notExecutable("bin/cinfo");
    EXPECT_EQ(shared("ux"), "");
    home_.program("bin/cinfo", "exit 1");
    EXPECT_EQ(shared("ux"), "");
    EXPECT_THAT(trace_.errors("zavtasks"), ElementsAre("Bad return code from Util::runCommand",
                                                       "Bad return code from Util::runCommand",
                                                       "Bad return code from Util::runCommand"));
    EXPECT_EQ(trace_.count('D', "Architecture for product code [ux] is []"), 3);
}

TEST_F(ProductArch, IsFoundInAListOfEightMegabytes) {
    std::string list = header();
    while (list.size() < (8u << 20))
        list += line("zz", "li6263");
    home_.inventory(list + line("ux", "li6243"));
    const TraceCapture quiet("ERROR");
    EXPECT_EQ(shared("ux"), "li6243");
    EXPECT_THAT(quiet.errors(), IsEmpty());
}

// ---- Directories --------------------------------------------------------------------------------

TEST_F(ProductArch, DirectoriesLieUnderTheHome) {
    EXPECT_EQ(narrow(getProductArchDir("aix523", "ux")), home_.home() + "/agtqvs6/aix523/ux");
    EXPECT_EQ(narrow(getProductArchDir("aix523", "ax")), home_.home() + "/agtqvs6/aix523/bin");
    EXPECT_THAT(trace_.details("zavtasks"),
                ElementsAre("Architecture directory for architecture [aix523] product code [ux] is "
                            "[" +
                                home_.home() + "/agtqvs6/aix523/ux]",
                            "Architecture directory for architecture [aix523] product code [ax] is "
                            "[" +
                                home_.home() + "/agtqvs6/aix523/bin]"));
}

TEST_F(ProductArch, DirectoriesNeedBothNames) {
    EXPECT_EQ(narrow(getProductArchDir("", "ux")), "");
    EXPECT_EQ(narrow(getProductArchDir("aix523", "")), "");
    EXPECT_EQ(narrow(getProductArchDir("", "")), "");
    EXPECT_EQ(trace_.count('D',
                           "Architecture directory for architecture [] product code [ux] "
                           "is []"),
              1);
}

TEST_F(ProductArch, TheSharedComponentGoesWithTheArchitectureOfLz) {
    home_.inventory(header() + line("lz", "li6243") + line("ax", "aix543") + line("ax", "li6263"));
    EXPECT_EQ(narrow(getSharedLibArchDir()), home_.home() + "/agtqvs6/aix543/bin");
    EXPECT_THAT(home_.calls("bin/cinfo"), testing::SizeIs(2));
    EXPECT_EQ(trace_.count('D', "Architecture directory for Shared Lib [ax] is is [" +
                                    home_.home() + "/agtqvs6/aix543/bin]"),
              1);
}

TEST_F(ProductArch, TheFirstSharedComponentIsTakenWithoutLz) {
    home_.inventory(header() + line("ax", "aix543") + line("ax", "li6263"));
    EXPECT_EQ(narrow(getSharedLibArchDir()), home_.home() + "/agtqvs6/aix543/bin");
}

TEST_F(ProductArch, WithoutASharedComponentThereIsNoDirectory) {
    home_.inventory(header() + line("lz", "li6263") + line("ax", "sol288"));
    EXPECT_EQ(narrow(getSharedLibArchDir()), "");
    EXPECT_EQ(trace_.count('D', "Architecture directory for Shared Lib [ax] is is []"), 1);
}

}  // namespace
