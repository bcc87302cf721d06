// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/CountingSamlToken.h"

namespace TestSupport {

CountingSamlToken::CountingSamlToken()
    : id("_token-id-not-for-logs"),
      startDate("2020-01-01T00:00:00Z"),
      endDate("2030-01-01T00:00:00Z"),
      subject("alice", "example.com"),
      renewable(false),
      delegable(true),
      solution(false),
      confirmationMethod(CONFIRM_BEARER),
      fullName("given-name-not-for-logs", "surname-not-for-logs"),
      audience({"urn:audience-not-for-logs"}),
      advice({{"advice-source-not-for-logs", {{"advice-name-not-for-logs", {"advice-value-not-for-logs"}}}}}),
      xml("<xml-not-for-logs/>"),
      reads(0) {}

}  // namespace TestSupport
