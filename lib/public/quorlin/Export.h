// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Marks what the shared library hands out. Everything else is compiled with hidden visibility. Also readable
// by a C compiler.

#ifndef QUORLIN_EXPORT_H
#define QUORLIN_EXPORT_H

#if defined(__GNUC__)
#define QUORLIN_API __attribute__((visibility("default")))
#else
#define QUORLIN_API
#endif

#endif /* QUORLIN_EXPORT_H */
