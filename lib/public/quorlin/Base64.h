/* SPDX-License-Identifier: Apache-2.0 */
/* Copyright the Quorlin authors */

/*
 * A base64 codec (RFC 4648, section 4) with a flat C interface. It works on the caller's buffers, reports
 * success as a boolean, never throws, and validates no pointers: none may be null unless its comment says so.
 */

#ifndef QUORLIN_BASE64_H
#define QUORLIN_BASE64_H

#include <quorlin/Export.h>

#include <stdbool.h>
#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/*
 * Encodes `sourceLength` bytes into `destination`, NUL-terminated. True when `destinationSize` has room for
 * the text and its NUL; otherwise nothing is written. `written` (may be null) receives the number of
 * characters before the NUL, 0 on failure.
 */
QUORLIN_API bool Base64_Encode(const void* source, size_t sourceLength, char* destination,
                               size_t destinationSize, size_t* written);

/*
 * Decodes NUL-terminated text. White space is skipped; decoding ends at the NUL or the first "=". False for
 * any other character outside the alphabet and when the buffer is full. `written` receives the number of
 * bytes, 0 on failure.
 */
QUORLIN_API bool Base64_Decode(const char* source, void* destination, size_t destinationSize,
                               size_t* written);

/* The same for text of at most `sourceLength` characters. Bits that do not complete a byte are dropped. */
QUORLIN_API bool Base64_ChunkDecode(const char* source, size_t sourceLength, void* destination,
                                    size_t destinationSize, size_t* written);

/* Whether all `sourceLength` characters are letters or digits of the current locale, "+", "/" or "="
 * (anywhere). */
QUORLIN_API bool Base64_ValidEncoding(const char* source, size_t sourceLength);

/* The buffer size that Base64_Encode needs for `sourceLength` bytes, the NUL included. `source` is not looked
 * at. */
QUORLIN_API size_t Base64_EncodedLength(const void* source, size_t sourceLength);

/* The buffer size for decoding a padded text without white space: its last two characters tell the padding.
 */
QUORLIN_API size_t Base64_DecodedLength(const char* source, size_t sourceLength);

/* Encodes into a new NUL-terminated text that the caller releases with free(). On failure `*result` is null.
 */
QUORLIN_API bool Base64_EasyEncode(const void* source, size_t sourceLength, char** result);

/* Decodes NUL-terminated text into new bytes that the caller releases with free(). On failure `*result` is
 * null, `*resultLength` 0. */
QUORLIN_API bool Base64_EasyDecode(const char* source, void** result, size_t* resultLength);

#ifdef __cplusplus
}
#endif

#endif /* QUORLIN_BASE64_H */
