/// Rows as they may be kept.
#pragma once

#include <string>

#include "embedded/oxa_host.h"

namespace host {

/// The row with "***" in the place of what follows "password=" and the like in its free texts.
/// Names and numbers stay: rows are found by them. The row keeps its length.
std::string maskedRow(const oxa::Table& table, std::string row);

}  // namespace host
