// libqvAvahiClient.so.14: one Avahi threaded poll and one Avahi client per process, and a
// poll lock that a callback already running on the poll thread may ask for again.
//
// Threads: AvahiClientNew, AvahiThreadedPollStart, AvahiThreadedPollStop and
// AvahiClientFree are called by one controlling thread, never from a callback. The entry
// group calls and the lock may be called from the controlling thread (inPollThread 0) or
// from a client or entry-group callback (inPollThread 1): callbacks run on the poll thread
// with the poll lock held, so with 1 the lock neither blocks nor releases that hold.
//
// Callbacks may run at once, on the calling thread, inside AvahiClientNew and
// AvahiEntryGroupNew; the wrapper stores the new handle through the caller's pointer before
// such a callback runs. After AvahiThreadedPollStop returns, no callback runs.
//
// Failure: every call returns 0 or a negative Avahi error number (AVAHI_ERR_*); a failed
// call leaves nothing behind.
#pragma once

#include <avahi-client/client.h>
#include <avahi-client/publish.h>

#ifdef __cplusplus
extern "C" {
#endif

// Makes the process's poll (not yet running) and its client. AVAHI_ERR_BAD_STATE when a
// client exists already; the daemon's absence gives AVAHI_ERR_NO_DAEMON (no retry).
int AvahiClientNew(AvahiClientCallback callback, void* userdata, AvahiClient** client);

// Stops the poll thread if it still runs, frees the client (with any group left) and the
// poll. AVAHI_ERR_BAD_STATE when there is no client.
int AvahiClientFree(void);

// A new entry group of client; callback gets (group, state, userdata).
int AvahiEntryGroupNew(AvahiClient* client, AvahiEntryGroupCallback callback, void* userdata,
                       int inPollThread, AvahiEntryGroup** group);

// Frees a group made by AvahiEntryGroupNew; its callback is not called afterwards.
int AvahiEntryGroupFree(AvahiEntryGroup* group, int inPollThread);

// Starts and stops the poll thread. Stop joins it.
int AvahiThreadedPollStart(void);
int AvahiThreadedPollStop(void);

// With inPollThread 0, excludes the poll thread; with 1, does nothing.
int AvahiThreadedPollLock(int inPollThread);
int AvahiThreadedPollUnlock(int inPollThread);

#ifdef __cplusplus
}
#endif
