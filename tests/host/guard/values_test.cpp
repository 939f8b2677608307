// The guard of values that become words of a command line.
#include "host/guard/guard_fixture.h"

namespace {

class ValuesGuard : public GuardTest {
protected:
    std::string ofTarget(const std::string& target) {
        return refuser(command("GETCONFIG", "ux", {{"TARGETMSN", target}}));
    }
    std::string ofInstance(const std::string& name) {
        return refuser(command("START", "ux", {{"TARGETMSN", name}, {"OPTIONAL", "INSTANCE"}}));
    }
};

TEST_F(ValuesGuard, TakesPlainNames) {
    for (const char* product : {"ux", "UM", "x1", "0", ""})
        EXPECT_EQ(refusalOf(command("GETCONFIG", product)), "") << product;
    for (const char* version : {"060100000", "6.3", "6.3-rc_1"})
        EXPECT_EQ(refusalOf(command("INSTALL", "ux", {{"VERSION", version}})), "") << version;
    for (const char* target : {"inst1:host.example.com:UX", "host:UX", "a/b_c-d:UX", ""})
        EXPECT_EQ(ofTarget(target), "") << target;
    for (const char* name : {"inst1", "a.b_c-d"})
        EXPECT_EQ(ofInstance(name), "") << name;
}

TEST_F(ValuesGuard, RefusesProductsThatAreMoreThanOneWord) {
    EXPECT_EQ(refusalOf(command("START", "ux -h /elsewhere")),
              "values 400: PRODUCT \"ux -h /elsewhere\" is not a product code; it is made of ASCII "
              "letters and digits, and does not begin with -");
    for (const char* product : {"ux ", " ux", "u\tx", "ux\n", "u\"x", "u'x", "u;x", "u.x", "../x"})
        EXPECT_EQ(refuser(command("START", product)), "values") << product;
}

TEST_F(ValuesGuard, RefusesVersionsThatAreNoNames) {
    for (const char* version : {"6 3", "6/3", "6:3", "$(x)", "-6"})
        EXPECT_EQ(refuser(command("INSTALL", "ux", {{"VERSION", version}})), "values") << version;
}

TEST_F(ValuesGuard, RefusesTargetsThatAreNoNames) {
    for (const char* target :
         {"a b:UX", "a\":host:UX", "a';id;':UX", "-pc", "$x:UX", "a|b", "a\nb"})
        EXPECT_EQ(ofTarget(target), "values") << target;
}

TEST_F(ValuesGuard, AnInstanceIsNoManagedSystemName) {
    for (const char* name : {"a:b", "a/b", "a b", "a\"b", "-o"})
        EXPECT_EQ(ofInstance(name), "values") << name;
    EXPECT_EQ(refuser(command("STOP", "ux", {{"TARGETMSN", "a/b"}, {"OPTIONAL", "INSTANCE"}})),
              "target")
        << "only a START takes an instance's name";
}

TEST_F(ValuesGuard, RefusesNamesOfDirectories) {
    EXPECT_EQ(refusalOf(command("INSTALL", "ux", {{"VERSION", ".."}})),
              "values 400: VERSION \"..\" is not a version; no part of it is . or .., which name "
              "directories");
    EXPECT_EQ(refuser(command("INSTALL", "ux", {{"VERSION", "."}})), "values");
    for (const char* target : {".", "..", "../..", "../x:UX", "a/../b:UX", "..:host:UX", "a:.:UX"})
        EXPECT_EQ(ofTarget(target), "values") << target;
    for (const char* name : {".", ".."})
        EXPECT_EQ(ofInstance(name), "values") << name;
    EXPECT_EQ(ofInstance("..."), "") << "a name like any other";
    EXPECT_EQ(ofTarget("a..b:UX"), "");
}

TEST_F(ValuesGuard, ShowsLongValuesInPart) {
    const std::string refusal = refusalOf(command("START", std::string(100'000, '.')));
    EXPECT_LT(refusal.size(), 400U);
    EXPECT_EQ(refusal.substr(0, 28), "values 400: PRODUCT \".......");
}

}  // namespace
