/// Stands in for the fuzzing engine: runs a target over files, and over all files of folders.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

using std::filesystem::path;

std::vector<path> FilesIn(const path& name) {
  if (!std::filesystem::is_directory(name)) return {name};
  std::vector<path> files;
  for (const auto& entry : std::filesystem::directory_iterator(name))
    if (entry.is_regular_file()) files.push_back(entry.path());
  std::sort(files.begin(), files.end());
  return files;
}

bool Replay(const path& file) {
  std::printf("%s\n", file.c_str());  // the last line says which one failed
  std::fflush(stdout);
  std::ifstream stream(file, std::ios::binary);
  const std::vector<char> bytes{std::istreambuf_iterator<char>(stream), {}};
  if (stream.bad() || !stream.is_open()) return false;
  const std::vector<uint8_t> input(bytes.begin(), bytes.end());  // exact: no byte behind its end
  return LLVMFuzzerTestOneInput(input.data(), input.size()) == 0;
}

}  // namespace

int main(int argc, char** argv) {
  size_t replayed = 0;
  for (int i = 1; i < argc; ++i)
    for (const path& file : FilesIn(argv[i])) {
      if (!Replay(file)) {
        std::fprintf(stderr, "%s: cannot be replayed.\n", file.c_str());
        return 1;
      }
      ++replayed;
    }
  if (replayed > 0) return 0;
  std::fprintf(stderr, "Name files or folders of a corpus that is not empty.\n");
  return 1;
}
