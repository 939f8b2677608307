/// Which architecture a product is installed for, and in which directory. Each call asks the
/// inventory program `<home>/bin/cinfo` anew, so a task asks once. An empty result means that the
/// product is not installed or that the inventory did not answer; nothing here fails otherwise.
#pragma once

#include "base/zavstr.h"

/// The architecture of `product` by the inventory's report about that one product.
ZAV::String getProductArch(const ZAV::String& product);

/// The architecture of `product` by the list of all products. With an empty `preferred` it is that
/// of the product's first line, else that of the first line whose platform ends like `preferred`
/// and is as long, or of the last line. Six platforms are never chosen for the shared component
/// "ax".
ZAV::String getSharedLibArch(const ZAV::String& product, const ZAV::String& preferred);

/// The directory of a product, without a "/" at its end; empty when either argument is. The
/// shared component "ax" lives in the architecture's "bin" directory.
ZAV::String getProductArchDir(const ZAV::String& architecture, const ZAV::String& product);

/// The directory of the shared component's programs, of the architecture that goes best with
/// that of product "lz".
ZAV::String getSharedLibArchDir();
