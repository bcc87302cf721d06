// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Wire text as a file to compare with, and the masking of what differs from message to message.

#ifndef QUORLIN_TESTS_SUPPORT_GOLDENTEXT_H
#define QUORLIN_TESTS_SUPPORT_GOLDENTEXT_H

#include <string>

namespace TestSupport {

/// The text that the file `name` below tests/vectors stands for: lines joined without their ends and their
/// indentation, and
/// "{vendor}" replaced by the configured base of the vendor URIs. Throws std::runtime_error when there is no
/// such file.
std::string ReadGoldenText(const std::string& name);

/// The bytes of the file `name` below tests/vectors. Throws std::runtime_error when there is no such file.
std::string ReadVector(const std::string& name);

/// Puts a mask in the place of every well-formed volatile value; a malformed one stays and shows up as a
/// difference. UUIDs become "{uuid 1}", "{uuid 2}", ... by first appearance; a wsu:Created that a wsu:Expires
/// follows becomes "{time}" and the latter "{time + 600 s}" (seconds, with three decimals if they are not
/// whole); the content of ds:DigestValue becomes
/// "{digest}" if it is the base64 of 32 bytes, that of ds:SignatureValue "{signature}" if it is the base64 of
/// 256.
std::string MaskVolatile(const std::string& text);

/// `text` with every `from` (not empty) replaced by `to`.
std::string ReplaceAll(const std::string& text, const std::string& from, const std::string& to);

/// What lies between the first `open` and the next `close`. Throws std::runtime_error when there is no such
/// place.
std::string CutBetween(const std::string& text, const std::string& open, const std::string& close);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_GOLDENTEXT_H
