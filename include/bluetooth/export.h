#ifndef KESBLUETOOTH_EXPORT_H
#define KESBLUETOOTH_EXPORT_H

/// Marks what libkesbluetooth exports; everything else is built with hidden visibility.
#define KESBLUETOOTH_API __attribute__((visibility("default")))

#endif
