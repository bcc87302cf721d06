// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/SecurityTokenServiceConfig.h>

namespace Quorlin {

SecurityTokenServiceConfig::SecurityTokenServiceConfig() = default;

SecurityTokenServiceConfig::~SecurityTokenServiceConfig() = default;

SecurityTokenServiceConfig::SecurityTokenServiceConfig(const SecurityTokenServiceConfig& other) = default;

SecurityTokenServiceConfig& SecurityTokenServiceConfig::operator=(const SecurityTokenServiceConfig& other) =
    default;

}  // namespace Quorlin
