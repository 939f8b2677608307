/// Ctrl-C in the middle of a push.
#pragma once

namespace ctl {

/// While it exists, SIGINT, SIGTERM and SIGHUP end no more than the sending: the watched sockets
/// are shut down for writing, so that the program wakes up and can clean up. The second signal of a
/// kind has its usual effect. One object at a time.
class Interruption {
public:
    Interruption();
    ~Interruption();
    Interruption(const Interruption&) = delete;
    Interruption& operator=(const Interruption&) = delete;

    /// The signal that came; 0 when none has.
    static int signal();

    /// Ends all sending as this signal would, in a program that has handlers of its own. No push
    /// begins after that.
    static void interrupt(int signal);

    /// Adds or removes a socket. There is room for eight; what does not fit ends with its time-out.
    static void watch(int socket);
    static void forget(int socket);
};

}  // namespace ctl
