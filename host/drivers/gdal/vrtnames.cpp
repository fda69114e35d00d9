// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/vrtnames.h"

#include <cpl_minixml.h>
#include <cpl_string.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>

#include "host/drivers/gdal/gdalerrors.h"

namespace orin::drivers {
namespace {

constexpr uintmax_t kMaxTextBytes = uintmax_t{64} << 20;
constexpr int kMaxDepth = 1000;  // of elements, and of texts inside texts

struct DestroyTree {
  void operator()(CPLXMLNode* node) const { CPLDestroyXMLNode(node); }
};

bool IsText(const std::string& name) {
  const size_t start = name.find_first_not_of(" \t\r\n");
  return start != name.npos && name[start] == '<';
}

/// True for an element whose text is the name of a dataset.
bool HoldsName(const CPLXMLNode* element) {
  for (const char* name : {"SourceFilename", "SourceDataset", "DEMPath"})
    if (EQUAL(element->pszValue, name)) return true;
  const char* key = CPLGetXMLValue(element, "key", "");
  return EQUAL(element->pszValue, "MDI") && (EQUAL(key, "X_DATASET") || EQUAL(key, "Y_DATASET"));
}

class Collector {
 public:
  explicit Collector(std::vector<std::string>& names) : names_(names) {}

  bool AddText(const std::string& text, const std::string& folder, int depth) {
    if (depth > kMaxDepth) return false;
    const std::unique_ptr<CPLXMLNode, DestroyTree> tree(CPLParseXMLString(text.c_str()));
    return tree && AddTree(tree.get(), folder, depth);
  }

 private:
  bool AddTree(const CPLXMLNode* first, const std::string& folder, int depth) {
    if (depth > kMaxDepth) return false;
    for (const CPLXMLNode* node = first; node; node = node->psNext) {
      if (node->eType != CXT_Element) continue;
      if (HoldsName(node) && !AddNameOf(node, folder, depth)) return false;
      if (!AddTree(node->psChild, folder, depth + 1)) return false;
    }
    return true;
  }

  bool AddNameOf(const CPLXMLNode* element, const std::string& folder, int depth) {
    const std::string name = CPLGetXMLValue(element, nullptr, "");
    if (name.empty()) return true;
    if (IsText(name)) return AddText(name, "", depth + 1);
    const bool isRelative = std::atoi(CPLGetXMLValue(element, "relativeToVRT", "0")) != 0;
    names_.push_back(isRelative ? (std::filesystem::path(folder) / name).string() : name);
    return true;
  }

  std::vector<std::string>& names_;
};

}  // namespace

std::optional<std::vector<std::string>> NamesInVrtText(const std::string& text,
                                                       const std::string& folder) {
  const GdalErrors quiet;
  std::vector<std::string> names;
  if (!Collector(names).AddText(text, folder, 0)) return std::nullopt;
  return names;
}

std::optional<std::vector<std::string>> NamesInVrt(const std::string& file) {
  std::error_code error;
  if (!std::filesystem::is_regular_file(file, error)) return std::nullopt;
  if (std::filesystem::file_size(file, error) > kMaxTextBytes || error) return std::nullopt;
  std::ifstream stream(file, std::ios::binary);
  const std::string text{std::istreambuf_iterator<char>(stream), {}};
  return NamesInVrtText(text, std::filesystem::path(file).parent_path().string());
}

}  // namespace orin::drivers
