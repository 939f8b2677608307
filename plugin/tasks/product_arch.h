/// The architecture for which a product is installed, and its directory. Each call runs the
/// inventory program `<home>/bin/cinfo`, so a task should call once. An empty result means that the
/// product is not installed or that the inventory program failed; there are no other failures.
#pragma once

#include "base/zavstr.h"

/// The architecture of `product`, from the inventory's report about that one product.
ZAV::String getProductArch(const ZAV::String& product);

/// The architecture of `product`, from the list of all products. With an empty `preferred` the
/// product's first line is used. Otherwise it is the first line whose platform is as long as
/// `preferred` and ends in the same two characters, or else the last line. Six platforms are never
/// chosen for the shared component "ax".
ZAV::String getSharedLibArch(const ZAV::String& product, const ZAV::String& preferred);

/// The directory of a product, without a "/" at its end; empty when either argument is. The
/// shared component "ax" lives in the architecture's "bin" directory.
ZAV::String getProductArchDir(const ZAV::String& architecture, const ZAV::String& product);

/// The directory of the shared component's programs, for the architecture that best matches that of
/// product "lz".
ZAV::String getSharedLibArchDir();
