// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_WAKEUP_H
#define KESBT_AUTOCONNECTD_WAKEUP_H

/// @file
/// What wakes the main loop besides commands: a signal to end, and news from the Bluetooth daemon.
/// There is one for the process, because neither signal handlers nor the library's callbacks carry
/// a pointer of ours. The request functions may be called from any thread; requestStop() in a
/// signal handler too.

namespace AutoConnectd {

/// To be called before all others. @return false with errno set
bool openWakeup();
/// Lets SIGTERM and SIGINT request the stop.
void stopOnSignals();
/// To be watched for input.
int wakeupDescriptor();

void requestStop();
/// The adapters changed: the files are to be read again.
void requestReload();
/// A connection changed: the targets are to be asked.
void requestCheck();

bool stopRequested();
/// Forgets what woke the loop. @return whether a reload was requested since the last call
bool takeReload();

} // namespace AutoConnectd

#endif
