/// The two-way translator, and the directories that a request's text may name by tokens.
#pragma once

#include "base/zavstr.h"

/// Puts the translator's full path into `path` and returns true; when there is no translator,
/// `path` becomes empty and the result is false. Runs the inventory program.
bool getTwoWayTranslator(ZAV::String& path);

/// `text` with every "|DEPLOYDIR|" (the depot's directory of this product and version),
/// "|TOVRINHOME|" and "|DEPOTDIR|" replaced, in this order. A value put in by one is searched for
/// the following ones.
ZAV::String replaceTokens(const ZAV::String& text, const ZAV::String& product,
                          const ZAV::String& version);
