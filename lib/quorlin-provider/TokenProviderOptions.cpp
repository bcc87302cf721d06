// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/TokenProviderOptions.h>

namespace Quorlin {

TokenProviderOptions::TokenProviderOptions()
    : minimumLifeSec(60), refreshPercent(80), jitterPercent(10), firstRetrySec(1), maxRetrySec(60) {}

TokenProviderOptions::~TokenProviderOptions() = default;

TokenProviderOptions::TokenProviderOptions(const TokenProviderOptions& other) = default;

TokenProviderOptions& TokenProviderOptions::operator=(const TokenProviderOptions& other) = default;

}  // namespace Quorlin
