// SPDX-License-Identifier: Apache-2.0
/// @file
/// Runs a fuzz target once on each file that is an argument, or is below a folder that is an argument.

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size);
/// Few targets define this function, so it may be missing.
extern "C" __attribute__((weak)) int LLVMFuzzerInitialize(int *argc, char ***argv);

namespace {

std::vector<std::filesystem::path> ListFiles(const std::filesystem::path &path) {
  if (!std::filesystem::is_directory(path)) {
    return {path};
  }
  std::vector<std::filesystem::path> files;
  for (const auto &entry : std::filesystem::recursive_directory_iterator(path)) {
    if (entry.is_regular_file()) {
      files.push_back(entry.path());
    }
  }
  return files;
}

void Replay(const std::filesystem::path &file) {
  std::ifstream stream(file, std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + file.string());
  }
  const std::string text{std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
  // A block of exactly this size, so that a sanitizer sees a read past its end.
  const std::vector<std::uint8_t> bytes(text.begin(), text.end());
  LLVMFuzzerTestOneInput(bytes.data(), bytes.size());
}

} // namespace

int main(int argc, char **argv) {
  std::size_t count = 0;
  std::string current;
  try {
    if (LLVMFuzzerInitialize != nullptr) {
      LLVMFuzzerInitialize(&argc, &argv);
    }
    for (int i = 1; i < argc; ++i) {
      for (const auto &file : ListFiles(argv[i])) {
        current = file.string();
        Replay(file);
        ++count;
      }
    }
  } catch (const std::exception &error) {
    std::fprintf(stderr, "failed on %s: %s\n", current.c_str(), error.what());
    return 1;
  }
  if (count == 0) {
    std::fprintf(stderr, "no input to replay\n");
    return 1;
  }
  std::printf("%zu inputs replayed\n", count);
  return 0;
}
