// SPDX-License-Identifier: MIT
#include "host/datasources/vrtsources.h"

#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <stop_token>

#include "host/datasources/fingerprint.h"
#include "host/datasources/imagewatch.h"

namespace orin::datasources {
namespace {

constexpr size_t kMostSources = 100000;
constexpr uintmax_t kMostBytes = uintmax_t{64} << 20;  // of a text

std::string TextOfFile(const std::string& path) {
  std::error_code error;
  if (std::filesystem::file_size(path, error) > kMostBytes || error) return {};
  std::ifstream stream(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

void Replace(std::string& text, const std::string& from, const std::string& to) {
  for (size_t at = text.find(from); at != text.npos; at = text.find(from, at + to.size()))
    text.replace(at, from.size(), to);
}

std::string Unescaped(std::string text) {
  for (const auto& [name, character] :
       {std::pair{"&lt;", "<"}, {"&gt;", ">"}, {"&quot;", "\""}, {"&apos;", "'"}, {"&amp;", "&"}})
    Replace(text, name, character);
  return text;
}

/// The names in one text.
std::vector<std::string> NamesIn(const std::string& text, const std::filesystem::path& folder) {
  constexpr char kElement[] = "<SourceFilename";
  std::vector<std::string> names;
  for (size_t at = text.find(kElement); at != text.npos; at = text.find(kElement, at + 1)) {
    const size_t start = text.find('>', at);
    const size_t end = text.find("</SourceFilename", at);
    if (start == text.npos || end == text.npos || end < start) break;
    const std::string tag = text.substr(at, start - at);
    const std::string name = Unescaped(text.substr(start + 1, end - start - 1));
    const bool isRelative = tag.find("relativeToVRT=\"1\"") != tag.npos;
    names.push_back(isRelative ? (folder / name).string() : name);
  }
  return names;
}

}  // namespace

std::vector<std::string> SourcesOfVrt(const std::string& file) {
  std::vector<std::string> sources;
  std::set<std::string> seen = {file};
  std::vector<std::string> open = {file};  // virtual rasters whose text is still to be looked at
  for (size_t i = 0; i < open.size() && sources.size() < kMostSources; ++i) {
    const std::filesystem::path path(open[i]);
    for (std::string& name : NamesIn(TextOfFile(open[i]), path.parent_path())) {
      if (!seen.insert(name).second) continue;
      if (name.ends_with(".vrt")) open.push_back(name);
      sources.push_back(std::move(name));
    }
  }
  return sources;
}

std::string FingerprintOfVrt(const std::string& file) {
  Fingerprinter fingerprint;
  fingerprint.AddText(FingerprintOfFile(file, {}));  // which holds the names
  for (const std::string& source : SourcesOfVrt(file)) {
    const auto stamp = ImageWatch(source).Stamp();
    fingerprint.AddText(stamp ? TextOf(*stamp) : "");
  }
  return fingerprint.Text();
}

}  // namespace orin::datasources
