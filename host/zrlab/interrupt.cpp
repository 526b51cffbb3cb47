#include "host/zrlab/interrupt.h"

#include <atomic>
#include <csignal>
#include <thread>

#include <pthread.h>
#include <unistd.h>

#include "host/zrlab/terminal.h"

namespace host::interrupt {

namespace {

struct State {
    sigset_t signals{};
    std::stop_source stop;
    std::atomic<bool> isFirstDeferred{false};
    std::atomic<int> first{0};  // the number of the signal that came first
};

// Never destroyed: the thread that waits for signals uses it while the process exits.
State& state() {
    static State& shared = *new State;
    return shared;
}

bool isIgnored(int signal) {
    struct sigaction action {};
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

void awaitRequests() {
    State& shared = state();
    int signal = 0;
    sigwait(&shared.signals, &signal);
    if (shared.isFirstDeferred) {
        shared.first = signal;
        Terminal::shared().hurry();
        shared.stop.request_stop();
        sigwait(&shared.signals, &signal);
    }
    Terminal::shared().leave(128 + signal);
}

}  // namespace

void watch() {
    State& shared = state();
    sigemptyset(&shared.signals);
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
        if (!isIgnored(signal)) {
            sigaddset(&shared.signals, signal);
        }
    }
    pthread_sigmask(SIG_BLOCK, &shared.signals, nullptr);
    pthread_atfork(nullptr, nullptr,
                   [] { pthread_sigmask(SIG_UNBLOCK, &state().signals, nullptr); });
    std::signal(SIGPIPE, SIG_IGN);  // the write fails instead
    std::signal(SIGXFSZ, SIG_IGN);  // the same beyond a limit of file sizes
    std::thread(awaitRequests).detach();
}

std::stop_token deferFirst() {
    state().isFirstDeferred = true;
    return state().stop.get_token();
}

int exitStatus() {
    return 128 + state().first;
}

}  // namespace host::interrupt
