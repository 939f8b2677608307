/// Turns signals into a descriptor to wait for.
#pragma once

#include <initializer_list>

namespace host {

/// Catches the signals for the rest of the process's life. Returns a descriptor that becomes
/// readable when one of them arrives; it stays open. Call it once for each signal, before other
/// threads exist. Throws StartError.
int catchSignals(std::initializer_list<int> signals);

/// Makes such a descriptor unreadable until the next signal. Any thread.
void forgetSignals(int descriptor);

}  // namespace host
