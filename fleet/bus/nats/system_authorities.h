/// Authorities that the system trusts, such as those of browsers. Included by this folder's sources
/// only.
#pragma once

#include <cstdint>

namespace fleet {

/// The client library would add them, a hundred and more, to those that a connection is told to
/// trust: any of them could vouch for a server of the bus. Nor would that be cheap: each connection
/// would read all of them, which takes 20 ms and 1 MB.
///
/// So it gets none, nor does anything else in the process. This tells how often that has happened
/// on this thread: whoever makes a connection's options makes sure that it has.
std::uint64_t withheldSystemAuthorities();

}  // namespace fleet
