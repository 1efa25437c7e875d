// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_COMMON_STOP_REQUEST_H
#define KESBT_COMMON_STOP_REQUEST_H

/// @file
/// Ends a daemon within 2 s of SIGTERM or SIGINT, whatever hangs.
///
/// From the first of these signals the daemon has 1.5 s to stop what it began and to return from
/// main(). Where a call blocks for longer, the process then ends by _exit(), with status 0: no
/// destructor runs, and the system releases its locks, files and names on the buses. Programs that
/// the main thread has started are killed before. Further signals give no more time.
///
/// The deadline needs no loop, thread or lock of the program: it works while all of them hang.
/// SIGALRM is taken for it. There is one for the process.

namespace Tools {

/// To be called once, in the process that works: a fork() has no deadline of its own. Signals
/// before that end the process as is usual. @return false with errno set
bool stopOnSignals();

/// To be watched for input by the main loop: readable, without an end, once a stop is requested.
int stopDescriptor();
bool stopRequested();

} // namespace Tools

#endif
