/// The two reports from which the table KINAGT is made: the architecture probe's and the inventory
/// program's. Command lines and parsing only; running is the table's business. What a report lacks
/// is traced under the table's unit.
#pragma once

#include <functional>

#include "base/zavstr.h"

/// What the probe says of this host; both empty when it says nothing usable.
struct HostArchitecture {
    ZAV::String os;
    ZAV::String architecture;
};

/// One product of the inventory.
struct InstalledProduct {
    ZAV::String code;
    ZAV::String description;
    ZAV::String platform;
    ZAV::String version;  ///< as the table shows it
    ZAV::String release;
};

/// The probe's command line: a Korn shell that reads the home's architecture script and prints a
/// header and two lines.
ZAV::String architectureProbeCommand(const ZAV::String& home);
HostArchitecture parseArchitectureProbe(const ZAV::String& output);

ZAV::String inventoryCommand(const ZAV::String& home);

/// Gives each product of the inventory to `take`, in the report's order and without duplicates,
/// until it returns a status other than 0. Returns that status, or 0. Takes time in proportion to
/// the report.
int forEachProduct(const ZAV::String& inventory,
                   const std::function<int(const InstalledProduct& product)>& take);
