/// The two reports behind the table KINAGT: the architecture probe's and the inventory program's.
/// This unit makes the command lines and parses the output; the table runs the commands. Whatever
/// is missing in a report is traced under the table's unit.
#pragma once

#include <functional>

#include "base/zavstr.h"

/// The probe's answer for this host; both are empty when it has none that can be used.
struct HostArchitecture {
    ZAV::String os;
    ZAV::String architecture;
};

/// One installed product, as the inventory program lists it.
struct InstalledProduct {
    ZAV::String code;
    ZAV::String description;
    ZAV::String platform;
    ZAV::String version;  ///< in the form that the table shows
    ZAV::String release;
};

/// The probe's command line: a Korn shell that reads the home's architecture script and prints a
/// header and two lines.
ZAV::String architectureProbeCommand(const ZAV::String& home);
HostArchitecture parseArchitectureProbe(const ZAV::String& output);

ZAV::String inventoryCommand(const ZAV::String& home);

/// Calls `take` for each product of the inventory, in the report's order and without duplicates,
/// until it returns a status other than 0. Returns that status, or 0. Takes time linear in the
/// length of the report.
int forEachProduct(const ZAV::String& inventory,
                   const std::function<int(const InstalledProduct& product)>& take);
