// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Object.h>

namespace Pelmar {

Object::~Object() = default;

}  // namespace Pelmar
