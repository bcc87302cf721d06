// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/Failure.h"

#include <quorlin/Exceptions.h>

#include <exception>
#include <string>

namespace Quorlin {

namespace {

Failure MakeOther(const std::string& text) {
  return std::make_shared<Pelmar::Exception>("The request for a token failed: " + text);
}

Failure Copy() {
  try {
    throw;
  } catch (const Pelmar::Exception& error) {
    return Failure(error.Clone());
  } catch (ParseException* error) {
    // CreateSamlToken throws a pointer for one defect, and whoever catches it owns it.
    const std::unique_ptr<ParseException> owned(error);
    return Failure(owned->Clone());
  } catch (const std::exception& error) {
    return MakeOther(error.what());
  } catch (...) {
    return MakeOther("an exception of an unknown class");
  }
}

}  // namespace

const Failure& GetOutOfMemoryFailure() {
  // Never destroyed: threads that still run when the process exits may ask for it.
  static const Failure* const failure = new Failure(MakeOther("out of memory"));
  return *failure;
}

Failure KeepCurrentException() noexcept {
  try {
    return Copy();
  } catch (...) {
    return GetOutOfMemoryFailure();
  }
}

}  // namespace Quorlin
