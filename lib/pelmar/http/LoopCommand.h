// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What other threads tell the HTTP loop.

#ifndef PELMAR_HTTP_LOOPCOMMAND_H
#define PELMAR_HTTP_LOOPCOMMAND_H

#include <pelmar/Ref.h>

#include <cstdint>
#include <list>

namespace Pelmar {
namespace Http {

class Exchange;

enum class LoopVerb { SUBMIT, ABANDON, DROP_AGENT, DROP_SPEC };

struct LoopCommand {
  LoopVerb verb;
  Ref<Exchange> exchange;  ///< Of SUBMIT and ABANDON.
  std::uint64_t id;        ///< Of the others.
};

/// In a list so that it can be made while there is memory, and given when there may be none.
using LoopCommands = std::list<LoopCommand>;

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_LOOPCOMMAND_H
