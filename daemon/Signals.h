#pragma once
// The signals the daemon takes through its signalfd instead of dying of them: every one that
// would end the process by default, so that keys are released and the socket removed whatever
// stops it, and SIGHUP, which asks for the configuration to be read again and never stops it.

#include <csignal>

namespace TolkaTouch {

inline sigset_t daemonSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (int signal : {SIGTERM, SIGINT, SIGQUIT, SIGHUP, SIGUSR1, SIGUSR2}) sigaddset(&signals, signal);
    return signals;
}

}  // namespace TolkaTouch
