// Requests to stop the program, which arrive as signals: an interrupt (Ctrl-C), a request to terminate, and
// the end of its terminal.
//
// A request ends the program at once, until a session asks for the first one to be handed to it: it then
// has the time to write its reports, and the next request ends the program at once. The exit status of a
// stopped program is 128 plus the signal's number.
#ifndef ZR_HOST_ZRLAB_INTERRUPT_H
#define ZR_HOST_ZRLAB_INTERRUPT_H

#include <stop_token>

namespace host::interrupt {

// Begins to watch. Call once, before any thread is started: the signals are blocked in every thread from
// then on, and unblocked again in a process that is forked. A signal that is ignored when the program
// starts (by nohup, or by a shell for a job in the background) stays ignored.
void watch();

// From now on the first request only asks this token to stop. Call after watch(), on any thread.
std::stop_token deferFirst();

// The exit status of a program that the first request stopped. Call once the token was asked to stop.
int exitStatus();

}  // namespace host::interrupt

#endif
