// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Marks what the shared library hands out. Everything else is compiled with hidden visibility.

#ifndef PELMAR_EXPORT_H
#define PELMAR_EXPORT_H

#if defined(__GNUC__)
#define PELMAR_API __attribute__((visibility("default")))
#else
#define PELMAR_API
#endif

#endif  // PELMAR_EXPORT_H
