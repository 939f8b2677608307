/// Rows as they may be kept, and as those may see them who may only read.
#pragma once

#include <string>

#include "embedded/oxa_host.h"

namespace host {

/// The row with "***" in the place of what follows "password=" and the like in its free texts.
/// Names and numbers stay: rows are found by them. The row keeps its length.
std::string maskedRow(const oxa::Table& table, std::string row);

/// The masked row without the values of its message: a command that failed may have written them.
/// The row keeps its length.
std::string rowForReaders(const oxa::Table& table, std::string row);

}  // namespace host
