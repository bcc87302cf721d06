// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Stands in for libFuzzer where it is not linked: runs the fuzz target once over every file named on the
// command line, and over every file below each folder named there. A name that is missing or holds no file is
// an error, so that a lost corpus cannot pass for a clean run.

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

namespace fs = std::filesystem;

// In name order, so that two runs over the same corpus do the same.
std::vector<fs::path> FilesBelow(const fs::path& root) {
  if (!fs::is_directory(root)) {
    return {root};
  }
  std::vector<fs::path> files;
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(root)) {
    if (entry.is_regular_file()) {
      files.push_back(entry.path());
    }
  }
  if (files.empty()) {
    throw std::runtime_error("no file below " + root.string());
  }
  std::sort(files.begin(), files.end());
  return files;
}

std::string ReadFile(const fs::path& path) {
  std::ifstream stream(path, std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + path.string());
  }
  std::string content((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
  return content;
}

void Replay(const fs::path& path) {
  const std::string content = ReadFile(path);
  // The name comes first: if the target aborts, the last line says on which input.
  std::cout << path.string() << " (" << content.size() << " bytes)" << std::endl;
  LLVMFuzzerTestOneInput(reinterpret_cast<const uint8_t*>(content.data()), content.size());
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::cerr << "usage: " << argv[0] << " FILE-OR-FOLDER...\n";
    return 2;
  }
  try {
    size_t replayed = 0;
    for (int i = 1; i < argc; ++i) {
      for (const fs::path& path : FilesBelow(argv[i])) {
        Replay(path);
        ++replayed;
      }
    }
    std::cout << "replayed " << replayed << " inputs\n";
    return 0;
  } catch (const std::exception& error) {
    std::cerr << argv[0] << ": " << error.what() << '\n';
    return 1;
  }
}
