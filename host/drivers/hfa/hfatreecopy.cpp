// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfatreecopy.h"

#include <algorithm>
#include <filesystem>
#include <utility>

#include "host/drivers/hfa/hfarecord.h"
#include "host/drivers/hfa/hfatree.h"
#include "host/drivers/hfa/patchedfile.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

template <class T>
bool Holds(const std::vector<T>& list, const T& entry) {
  return std::find(list.begin(), list.end(), entry) != list.end();
}

/// Gives an item its data, with its text behind it.
void SetText(HfaNodeCopy& item, const std::string& text) {
  constexpr uint32_t kColumnBytes = 14, kTextType = 3;
  item.newDataBytes = kColumnBytes;
  item.newData = [text](uint32_t position) {
    std::string data(kColumnBytes, '\0');
    const std::string cell = text + '\0';
    PutHfaNumber(data, 0, 1);  // rows
    PutHfaNumber(data, 4, position + kColumnBytes);
    data[8] = kTextType;
    PutHfaNumber(data, 10, static_cast<uint32_t>(cell.size()));
    return data + cell;
  };
}

/// Makes the changes in a copy.
class Changer {
 public:
  Changer(HfaTree& tree, const std::string& fileName, const HfaTreeChanges& changes)
      : tree_(tree), fileName_(fileName), changes_(changes), items_(HfaItemsOf(tree)) {}

  void Change(HfaNodeCopy& root) {
    unsigned channel = 0;
    for (HfaNodeCopy& layer : root.children)
      if (IsHfaLayer(layer.original)) ChangeLayer(layer, ++channel);
    ChangeItems(root);
  }

 private:
  void ChangeLayer(HfaNodeCopy& layer, unsigned channel) {
    HfaNameList list;
    for (const HfaNodeCopy& part : layer.children)
      if (IsHfaNameList(part.original)) list = HfaNameList(tree_.DataOf(part.original));
    const bool hadNames = !list.IsEmpty();
    std::erase_if(layer.children, [&](const HfaNodeCopy& part) {
      const unsigned factor = FactorOfHfaPart(part.original);
      return factor != 0 && (Holds(changes_.removedLevels, factor) ||
                             (hadNames && !list.Has(factor) && IsLeftOver(factor)));
    });
    bool isChanged = list.Remove(changes_.removedLevels);
    const auto part = changes_.parts.find(channel);
    if (part != changes_.parts.end()) {
      PutPart(layer, part->second);
      isChanged = AddName(layer, list) || isChanged;
    }
    if (isChanged) PutList(layer, list);
  }

  bool IsLeftOver(unsigned factor) const {
    return factor == changes_.level || items_.contains(HfaRecordKey(factor));
  }

  void PutPart(HfaNodeCopy& layer, uint32_t position) {
    HfaNodeCopy part(tree_, tree_.NodeAt(position));
    const auto there =
        std::find_if(layer.children.begin(), layer.children.end(), [&](const HfaNodeCopy& child) {
          return FactorOfHfaPart(child.original) == changes_.level;
        });
    if (there != layer.children.end()) *there = std::move(part);
    else layer.children.push_back(std::move(part));
  }

  /// \returns whether there was no such name. Levels that have been there without a list get names
  ///          as well: with a list, nothing else counts.
  bool AddName(const HfaNodeCopy& layer, HfaNameList& list) const {
    if (list.Has(changes_.level)) return false;
    const bool isFirst = list.IsEmpty();
    for (const HfaNodeCopy& part : layer.children) {
      const unsigned factor = FactorOfHfaPart(part.original);
      if (factor == changes_.level || (isFirst && factor != 0))
        list.Add(fileName_ + "(:" + layer.original.name + ":" + part.original.name + ")");
    }
    return true;
  }

  static void PutList(HfaNodeCopy& layer, const HfaNameList& list) {
    const auto there = std::find_if(layer.children.begin(), layer.children.end(),
                                    [](const auto& part) { return IsHfaNameList(part.original); });
    if (list.IsEmpty()) {
      if (there != layer.children.end()) layer.children.erase(there);
      return;
    }
    HfaNodeCopy& node = there != layer.children.end()
                            ? *there
                            : layer.children.emplace_back("RRDNamesList", "Eimg_RRDNamesList");
    node.newData = [list](uint32_t position) { return list.DataAt(position); };
  }

  void ChangeItems(HfaNodeCopy& root) {
    auto texts = changes_.items;
    HfaNodeCopy* table = nullptr;
    for (HfaNodeCopy& node : root.children) {
      if (!IsHfaItemTable(node.original)) continue;
      if (!table) table = &node;
      std::erase_if(node.children, [&](const HfaNodeCopy& item) {
        return IsHfaItem(item.original) && Holds(changes_.removedItems, item.original.name);
      });
      for (HfaNodeCopy& item : node.children) {
        const auto text = texts.find(item.original.name);
        if (!IsHfaItem(item.original) || text == texts.end()) continue;
        SetText(item, text->second);
        texts.erase(text);
      }
    }
    if (texts.empty()) return;
    if (!table) {
      table = &root.children.emplace_back("GDAL_MetaData", "Edsc_Table");
      table->newData = [](uint32_t) { return std::string("\1\0\0\0", 4); };  // rows
    }
    for (const auto& [key, text] : texts)
      SetText(table->children.emplace_back(key, "Edsc_Column"), text);
  }

  HfaTree& tree_;
  const std::string& fileName_;
  const HfaTreeChanges& changes_;
  const std::map<std::string, HfaItemPlace> items_;
};

}  // namespace

HfaTreeCopy::HfaTreeCopy(const std::string& libraryName, const std::string& fileName,
                         const HfaTreeChanges& changes) {
  HfaTree tree(libraryName);
  rootPointer_ = tree.FileHeader().RootPointer();
  root_ = std::make_unique<HfaNodeCopy>(tree, tree.Root());
  Changer(tree, fileName, changes).Change(*root_);
}

std::string HfaTreeCopy::BytesAt(uint32_t position) const { return root_->BytesAt(position); }

void ChangeHfaTree(const std::string& path, const HfaTreeChanges& changes) {
  const HfaTreeCopy copy(path, std::filesystem::path(path).filename().string(), changes);
  PatchedFile file(path);
  const auto position = static_cast<uint32_t>(file.Size());
  const std::string bytes = copy.BytesAt(position);
  if (file.Size() + bytes.size() > UINT32_MAX)
    throw Exception(FormatString(_("%s: would grow beyond the 2 GB that the format keeps in one "
                                   "file."),
                                 path.c_str()),
                    "host/drivers/hfa/hfatreecopy", "orin::drivers::ChangeHfaTree", 0);
  file.Write(position, bytes.data(), bytes.size());
  file.Keep();
  std::string number(4, '\0');
  PutHfaNumber(number, 0, position);
  file.WriteNow(copy.RootPointer(), number.data(), number.size());
  file.Sync();
}

bool HasUnlistedHfaLevel(const std::string& path, unsigned factor) {
  HfaTree tree(path);
  for (const HfaLayer& layer : HfaLayersOf(tree)) {
    HfaNameList list;
    bool isThere = false;
    for (const HfaNode& part : layer.parts) {
      if (IsHfaNameList(part)) list = HfaNameList(tree.DataOf(part));
      isThere = isThere || FactorOfHfaPart(part) == factor;
    }
    if (isThere && !list.IsEmpty() && !list.Has(factor)) return true;
  }
  return false;
}

}  // namespace orin::drivers
