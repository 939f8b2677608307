/// The two-way translator, and the tokens for directories that a request's text may contain.
#pragma once

#include "base/zavstr.h"

/// Stores the translator's full path in `path` and returns true. Without a translator empties
/// `path` and returns false. Runs the inventory program.
bool getTwoWayTranslator(ZAV::String& path);

/// Returns `text` with each "|DEPLOYDIR|" (the depot's directory for this product and version),
/// "|TOVRINHOME|" and "|DEPOTDIR|" replaced, in this order. Tokens in a replacement are replaced as
/// well when they come later in that order.
ZAV::String replaceTokens(const ZAV::String& text, const ZAV::String& product,
                          const ZAV::String& version);
