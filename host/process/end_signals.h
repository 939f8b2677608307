/// SIGTERM and SIGINT as something to wait for.
#pragma once

namespace host {

/// Catches both signals for the rest of the process's life. Returns a descriptor that becomes
/// readable with the first of them. Call once; throws StartError.
int catchEndSignals();

}  // namespace host
