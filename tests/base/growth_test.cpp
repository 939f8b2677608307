// The cost of large inputs grows in proportion to them.
// ctest-label: timing
#include "support/process/growth.h"

#include <gtest/gtest.h>

#include <string>

#include "base/zavdomp.h"
#include "base/zavrbndl.h"
#include "base/zavrunas.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"

using namespace ZAV;

namespace {

TEST(Growth, OfParsingManyElements) {
    const double growth = growthOverEightfold(2000, [](unsigned elements) {
        std::string text = "<a>";
        for (unsigned i = 0; i < elements; ++i)
            text += "\n\t<b k='v'>text</b>";
        DOMParser parser((text + "</a>").c_str());
        EXPECT_EQ(parser.parse(), 1);
    });
    EXPECT_LT(growth, kProportionate);
}

TEST(Growth, OfParsingALongText) {
    const double growth = growthOverEightfold(20000, [](unsigned lines) {
        std::string text = "<a>";
        for (unsigned i = 0; i < lines; ++i)
            text += "line\n";
        DOMParser parser((text + "</a>").c_str());
        EXPECT_EQ(parser.parse(), 1);
        EXPECT_EQ(String(parser.getDocument()->getElementText()).length(), lines * 5);
    });
    EXPECT_LT(growth, kProportionate);
}

TEST(Growth, OfBuildingSearchingAndDumpingAWideTree) {
    const double growth = growthOverEightfold(2000, [](unsigned children) {
        DOMElement root("a");
        for (unsigned i = 0; i < children; ++i)
            root.addChild(new DOMElement("child"));
        DOMNodeList* const found = root.getElementsByTagName("child");
        for (unsigned i = 0; i < found->getLength(); ++i)
            found->item(i);
        String out;
        root.dump(out);
        EXPECT_EQ(found->getLength(), children);
    });
    EXPECT_LT(growth, kProportionate);
}

TEST(Growth, OfReadingALongPropertyFile) {
    const ScratchDir scratch;
    const double growth = growthOverEightfold(3000, [&scratch](unsigned lines) {
        std::string text;
        for (unsigned i = 0; i < lines; ++i)
            text += "KEY" + std::to_string(i) + " = value\r\n";
        const ResourceBundle bundle(scratch.write("bundle", text).c_str(), '*');
        EXPECT_EQ(bundle.getKeys().getSize(), lines);
    });
    EXPECT_LT(growth, kProportionate);
}

/// A database of about `size` bytes: one agent for every 30 instances.
std::string database(std::size_t size) {
    std::string text = "<runas>\n";
    for (int agent = 0; text.size() < size; ++agent) {
        text += "\t<agent>\n\t\t<productCode>p" + std::to_string(agent) + "</productCode>\n";
        for (int i = 0; i < 30; ++i) {
            text += "\t\t<instance>\n\t\t\t<name>i" + std::to_string(i) +
                    "</name>\n\t\t\t<user>monitor</user>\n\t\t</instance>\n";
        }
        text += "\t</agent>\n";
    }
    return text + "</runas>\n";
}

TEST(Growth, OfReadingAndWritingALargeRunAsDatabase) {
    const ScratchDir scratch;
    const TraceCapture quiet("ERROR");
    const double growth = growthOverEightfold(1 << 17, [&scratch](unsigned size) {
        const std::string text = database(size);
        StartupDB db(String(scratch.write("runas.cfg", text).c_str()));
        EXPECT_EQ(db.getAgent("p0")->getNumInstances(), 30u);
        EXPECT_EQ(db.save(), 1);
        EXPECT_EQ(scratch.read("runas.cfg"), text);
    });
    EXPECT_LT(growth, kProportionate);
}

}  // namespace
