// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the HTTP loop has to tell when there may be no memory left to say it.

#ifndef PELMAR_HTTP_SPAREFAILURES_H
#define PELMAR_HTTP_SPAREFAILURES_H

#include <pelmar/http/HttpException.h>

#include <memory>

namespace Pelmar {
namespace Http {

struct SpareFailures {
  std::shared_ptr<const HttpException> outOfMemory;
  std::shared_ptr<const HttpException> engineBrokeDown;
  std::shared_ptr<const HttpException> processEnds;
};

/// Made by the first call, which is before the loop starts; that one may throw std::bad_alloc.
const SpareFailures& GetSpareFailures();

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_SPAREFAILURES_H
