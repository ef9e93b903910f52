// How the stand-in programs take their stop signals: SIGTERM and SIGINT are blocked in the calling
// thread, so in every thread it starts later, and are taken by one thread on purpose (sigwait or a
// signalfd). SIGPIPE is ignored: a peer that goes away must not end the program.
#pragma once

#include <pthread.h>
#include <signal.h>

namespace simcommon {

// Call first thing in main, before any thread starts. Returns the set of stop signals.
inline sigset_t blockStopSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    signal(SIGPIPE, SIG_IGN);
    return signals;
}

}  // namespace simcommon
