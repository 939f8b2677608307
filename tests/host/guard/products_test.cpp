// The guards of products that are not there.
#include "host/guard/guard_fixture.h"

namespace {

class ProductGuard : public GuardTest {};

const char* const kOnProducts[] = {"START", "STOP", "RESTART", "UNINSTALL", "SETCONFIG"};

TEST_F(ProductGuard, LetsInstalledProductsPassAndTakesOneInventory) {
    std::size_t taken = 0;
    for (const char* name : kOnProducts) {
        EXPECT_EQ(refusalOf(command(name, "ux")), "") << name;
        EXPECT_EQ(inventories(), ++taken) << name;
    }
}

TEST_F(ProductGuard, RefusesOthersWithTheList) {
    for (const char* name : kOnProducts) {
        EXPECT_EQ(refusalOf(command(name, "uz")),
                  "product 409: there is no product \"uz\" here; installed are um, ux; \"force\": "
                  "true (zavctl: --force) sends it all the same")
            << name;
    }
    install({"ax", "ux", "ux"});
    EXPECT_EQ(refusalOf(command("START", "db2")),
              "product 409: there is no product \"db2\" here; installed is ux; \"force\": true "
              "(zavctl: --force) sends it all the same");
    install({"ax"});
    EXPECT_EQ(refusalOf(command("START", "ux")),
              "product 409: there is no product \"ux\" here; none is installed; \"force\": true "
              "(zavctl: --force) sends it all the same");
}

TEST_F(ProductGuard, SaysThatAnInventoryThatFailedIsNoEmptyOne) {
    files.script("home/bin/cinfo", "exit 3");
    EXPECT_EQ(refusalOf(command("START", "ux")),
              "product 409: whether there is a product \"ux\" here is not known: bin/cinfo ended "
              "with exit code 3; \"force\": true (zavctl: --force) sends it all the same");
}

TEST_F(ProductGuard, AProductWithACommaInItsDescriptionIsThere) {
    const std::string list = files.read("list");
    files.write("list", list + "\"cx\",\"One, two\",\"li6263\",\"060100000\",\"100\"\n");
    EXPECT_EQ(refusalOf(command("START", "cx")), "");
}

TEST_F(ProductGuard, TellsUpperCaseFromLowerCaseAsTheHomeDoes) {
    EXPECT_EQ(refuser(command("START", "UX")), "product");
}

TEST_F(ProductGuard, ForceSendsItAllTheSameAndPassesNoOtherGuard) {
    EXPECT_EQ(refusalOf(command("STOP", "uz"), true), "");
    EXPECT_EQ(inventories(), 0U);
    EXPECT_EQ(refuser(command("STOP", "u z"), true), "values");
    EXPECT_EQ(refuser(command("STOP", "uz", {{"TARGETMSN", "typo:UZ"}}), true), "target");
}

TEST_F(ProductGuard, AsksNothingForCommandsThatChangeNoProduct) {
    for (const char* name : {"GETCONFIG", "COMPLETE_INSTALL", "INSTALL", "NOSUCH", ""})
        EXPECT_EQ(refusalOf(command(name, "uz")), "") << name;
    EXPECT_EQ(refusalOf(command("START", "")), "");
    EXPECT_EQ(inventories(), 0U);
}

TEST_F(ProductGuard, PassesBehindAnUnfinishedTaskOfTheSameProduct) {
    accept("INSTALL", "uz");
    EXPECT_EQ(refusalOf(command("START", "uz")), "");
    EXPECT_EQ(refusalOf(command("START", "UZ")), "");
    EXPECT_EQ(inventories(), 0U);
    EXPECT_EQ(refuser(command("START", "uy")), "product");
    finish();
    EXPECT_EQ(refuser(command("START", "uz")), "product");
}

class DeployFolderGuard : public GuardTest {
protected:
    Conditions install(const std::string& product, const std::string& version,
                       const std::string& context = "|DEPLOYDIR|/install.sh") {
        return command("INSTALL", product, {{"VERSION", version}, {"CONTEXT", context}});
    }
};

TEST_F(DeployFolderGuard, RefusesAnInstallFromAFolderThatIsNotThere) {
    EXPECT_EQ(refusalOf(install("ux", "6.3")),
              "deploy-folder 409: the depot has no folder ux/6.3; it has none; push the package to "
              "ux/6.3 first, or name the version that is there");
    files.makeDir("depot/ux/6.2/deep/er");
    files.makeDir("depot/um");
    files.write("depot/ux/6.3", "a file");
    EXPECT_EQ(refusalOf(install("ux", "6.3")),
              "deploy-folder 409: the depot has no folder ux/6.3; it has um, ux/6.2; push the "
              "package to ux/6.3 first, or name the version that is there");
    EXPECT_EQ(refusalOf(install("ux", "6.2")), "");
    EXPECT_EQ(inventories(), 0U) << "an install needs no inventory";
}

TEST_F(DeployFolderGuard, TheCommonInstallerHasOneFolderForAllVersions) {
    EXPECT_EQ(refuser(install("ci", "6.3")), "deploy-folder");
    files.makeDir("depot/ci");
    EXPECT_EQ(refusalOf(install("ci", "6.3")), "");
}

TEST_F(DeployFolderGuard, AsksOnlyWhenTheCommandNamesTheFolder) {
    EXPECT_EQ(refusalOf(install("ux", "6.3", "|DEPOTDIR|/install.sh")), "");
    EXPECT_EQ(refusalOf(install("ux", "6.3", "/opt/install.sh")), "");
}

}  // namespace
