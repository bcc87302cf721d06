// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/TemporaryDirectory.h"

#include "quorlin/Failure.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

namespace Cli {

TemporaryDirectory::TemporaryDirectory() {
  std::error_code error;
  _path = (std::filesystem::temp_directory_path(error) / "quorlin-XXXXXX").string();
  if (error || mkdtemp(_path.data()) == nullptr) {
    throw UsageException(std::string("cannot make a temporary directory: ") +
                         (error ? error.message() : std::strerror(errno)));
  }
}

TemporaryDirectory::~TemporaryDirectory() {
  Remove();
}

void TemporaryDirectory::Remove() const noexcept {
  std::error_code ignored;
  std::filesystem::remove_all(_path, ignored);
}

}  // namespace Cli
