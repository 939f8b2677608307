/// The universal agent's configuration files: finds and reads them, and rewrites the start-up
/// parameters.
#pragma once

#include "base/zavhmap.h"
#include "base/zavstr.h"

/// The full path of an instance's configuration file; the default instance's for an empty name.
ZAV::String getUaConfigFileName(const ZAV::String& instance);

/// The instance in a managed system name of the form INSTANCE:HOST:UA. Empty, which means the
/// default instance, when the name has no such part.
ZAV::String getUaInstanceName(const ZAV::String& managedSystemName);

/// Reads the NAME=value lines of a file. Skips lines that begin with `commentChar` and lines
/// without a name or a value. When a name appears twice, the last line wins. Returns an empty map
/// when the file cannot be read.
ZAV::StrStrMap populateHashMapFromFile(const ZAV::String& path, char commentChar);

/// Replaces the data provider line of `instance` in a start-up parameter file by one with `parms`.
/// Writes the new content to `<configFile>.copy` first; that file remains when the last steps fail.
/// Returns 1, or 0 on failure. Nobody else may change the file meanwhile.
int changeUaStartupParms(ZAV::String configFile, ZAV::String parms, ZAV::String instance);
