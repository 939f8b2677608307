/// The universal agent's configuration files: where they are, what they say, and the rewriting of
/// its start-up parameters.
#pragma once

#include "base/zavhmap.h"
#include "base/zavstr.h"

/// The full path of an instance's configuration file; the default instance's for an empty name.
ZAV::String getUaConfigFileName(const ZAV::String& instance);

/// The instance in a managed system name of the form INSTANCE:HOST:UA; empty, which stands for the
/// default instance, when the name has no such part.
ZAV::String getUaInstanceName(const ZAV::String& managedSystemName);

/// The NAME=value lines of a file. Lines that begin with `commentChar` are left out, and so are
/// those without a name or a value; of several lines with one name the last one counts. Empty when
/// the file cannot be read.
ZAV::StrStrMap populateHashMapFromFile(const ZAV::String& path, char commentChar);

/// Replaces the data provider line of `instance` in a start-up parameter file by one with `parms`.
/// Goes by way of a file `<configFile>.copy`, which stays behind, with the new content, when the
/// last steps fail. Returns 1, or 0 on failure. Nobody else may change the file meanwhile.
int changeUaStartupParms(ZAV::String configFile, ZAV::String parms, ZAV::String instance);
