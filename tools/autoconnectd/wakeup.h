// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBT_AUTOCONNECTD_WAKEUP_H
#define KESBT_AUTOCONNECTD_WAKEUP_H

/// @file
/// News from the Bluetooth daemon wakes the main loop. There is one wakeup for the process, because
/// the library's callbacks carry no pointer of ours. The tell functions may be called from any
/// thread.

namespace AutoConnectd {

/// What has been told since the last look.
struct News {
    bool adapters; ///< they changed: the files are to be read again
    bool power;    ///< an adapter was switched on or off
};

/// To be called before all others. @return false with errno set
bool openWakeup();
/// To be watched for input.
int wakeupDescriptor();

void tellAdapters();
/// An adapter's power, and so the adapters, changed.
void tellPower();
/// A connection changed: the targets are to be asked.
void tellConnection();

/// Forgets what woke the loop.
News takeNews();

} // namespace AutoConnectd

#endif
