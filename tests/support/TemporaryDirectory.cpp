// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/TemporaryDirectory.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <system_error>

namespace TestSupport {

TemporaryDirectory::TemporaryDirectory()
    : _path(std::filesystem::temp_directory_path().string() + "/quorlin-test-XXXXXX") {
  if (mkdtemp(&_path[0]) == nullptr) {
    throw std::system_error(errno, std::generic_category(), "mkdtemp");
  }
}

TemporaryDirectory::~TemporaryDirectory() {
  std::error_code ignored;
  std::filesystem::remove_all(_path, ignored);
}

std::string TemporaryDirectory::WriteFile(const std::string& name, const std::string& content) const {
  const std::string path = GetPath(name);
  std::ofstream stream(path, std::ios::binary | std::ios::trunc);
  stream << content;
  stream.close();
  if (!stream) {
    throw std::runtime_error("cannot write " + path);
  }
  return path;
}

std::string TemporaryDirectory::ReadFile(const std::string& name) const {
  std::ifstream stream(GetPath(name), std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + GetPath(name));
  }
  return std::string((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
}

}  // namespace TestSupport
