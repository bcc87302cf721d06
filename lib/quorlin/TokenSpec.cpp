// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/TokenSpec.h>

namespace Quorlin {

TokenSpec::TokenSpec()
    : tokenLifetimeSec(0), delegable(false), renewable(false), confirmation(CONFIRMATION_DEFAULT) {}

TokenSpec::~TokenSpec() = default;

TokenSpec::TokenSpec(const TokenSpec& other) = default;

TokenSpec& TokenSpec::operator=(const TokenSpec& other) = default;

}  // namespace Quorlin
