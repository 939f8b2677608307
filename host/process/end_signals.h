/// Turns SIGTERM and SIGINT into a descriptor to wait for.
#pragma once

namespace host {

/// Catches both signals for the rest of the process's life. Returns a descriptor that becomes
/// readable when the first one arrives; it stays open. Call it once. Throws StartError.
int catchEndSignals();

}  // namespace host
