// SPDX-License-Identifier: LGPL-2.1-or-later
#ifndef KESBLUETOOTH_EXPORT_H
#define KESBLUETOOTH_EXPORT_H

/// @file
/// What libkesbluetooth exports.

/// Marks what libkesbluetooth exports; everything else is built with hidden visibility.
#define KESBLUETOOTH_API __attribute__((visibility("default")))
/// Marks private members of exported classes that nobody else can use.
#define KESBLUETOOTH_LOCAL __attribute__((visibility("hidden")))

#endif
