#include "host/checks/check_fixture.h"

namespace {

using host::Verdict;

class PluginChecks : public CheckTest {};

TEST_F(PluginChecks, TheRealOneIsNamedWithItsVersion) {
    expectFinding("plug-in", Verdict::Ok, "lib/libzavmgmt.so, libzavmgmt.so.1");
}

TEST_F(PluginChecks, WhatCannotBeLoadedOrIsNoPlugInIsAnError) {
    options.plugin = "/nonexistent.so";
    expectFinding("plug-in", Verdict::Error, "plug-in cannot be loaded");
    options.plugin = ZAV_BUILD_DIR "/lib/libzavplatform.so";
    expectFinding("plug-in", Verdict::Error, "has no function Initialize_Mgmt_Functions");
}

TEST_F(PluginChecks, MissingNamesThatTheHostDoesNotNeedAreAWarning) {
    options.plugin = ZAV_BUILD_DIR "/lib/made_up_plugin.so";
    expectFinding("plug-in", Verdict::Warning,
                  "made_up_plugin.so does not export Initialize_Tovrin_Home and 17 other names");
}

}  // namespace
