// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Everything the library offers, but for the two headers over the asynchronous operations that not every
// program needs: quorlin/Future.h, and quorlin/Coroutine.h, which is C++20.

#ifndef QUORLIN_QUORLIN_H
#define QUORLIN_QUORLIN_H

#include <quorlin/Base64.h>
#include <quorlin/Exceptions.h>
#include <quorlin/GssNegotiationContext.h>
#include <quorlin/OperationMetrics.h>
#include <quorlin/PrincipalId.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/ServiceOptions.h>
#include <quorlin/TokenSpec.h>

#endif  // QUORLIN_QUORLIN_H
