/// Fuzzes what reads and changes the tree of ERDAS Imagine files (.img), whose numbers we write.
// SPDX-License-Identifier: MIT

// The input is a file. Its levels are listed, copied, removed and moved as a build and `clean` do
// it; the pixels of the image have to be what they were, and the tree has to be one.
#include <algorithm>
#include <map>
#include <set>
#include <string_view>

#include "fuzz/check.h"
#include "fuzz/scratchfile.h"
#include "host/drivers/hfa/hfablocks.h"
#include "host/drivers/hfa/hfacatalogue.h"
#include "host/drivers/hfa/hfacompactor.h"
#include "host/drivers/hfa/hfaspace.h"
#include "host/drivers/hfa/hfatreecopy.h"
#include "host/services/exception.h"

namespace {

using namespace orin;
using drivers::HfaCatalogue;

constexpr char kFile[] = "image.img";
constexpr size_t kMaxChannels = 4;

/// Runs one operation. A refusal is as good as success if it names the file.
template <class Operation>
bool Try(Operation&& operation) {
  try {
    operation();
    return true;
  } catch (const Exception& refusal) {
    fuzz::Demand(refusal.GetMessage().find(kFile) != std::string::npos, "a message names the file");
    return false;
  }
}

std::string BytesOf(const std::string& path) {
  std::ifstream stream(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

/// The stored pixels of the image, by where they stand: those that no number of the tree stands in.
std::map<uint32_t, std::string> PixelsOf(const std::string& path, size_t channels) {
  const std::string bytes = BytesOf(path);
  const drivers::HfaSpace space = drivers::FindHfaSpace(path, {});
  std::set<uint64_t> numbers = {drivers::HfaTree(path).FileHeader().RootPointer()};
  for (const drivers::HfaPointer& pointer : space.pointers) numbers.insert(pointer.position);
  std::map<uint32_t, std::string> pixels;
  for (unsigned channel = 1; channel <= std::min(channels, kMaxChannels); ++channel) {
    const auto map = drivers::FindHfaBlockMap(path, channel, 1);
    if (!map || !map->isHere) continue;
    for (const drivers::HfaBlock& block : map->blocks) {
      const uint64_t end = uint64_t{block.position} + block.bytes;
      const auto number = numbers.lower_bound(block.position < 4 ? 0 : block.position - 3);
      const bool isApart = number == numbers.end() || *number >= end;
      if (isApart && end <= bytes.size())
        pixels[block.position] = bytes.substr(block.position, block.bytes);
    }
  }
  return pixels;
}

void Demand(const std::string& path, const std::map<uint32_t, std::string>& pixels) {
  const std::string bytes = BytesOf(path);
  for (const auto& [position, block] : pixels)
    fuzz::Demand(bytes.compare(position, block.size(), block) == 0, "pixels stay what they are");
}

std::string Composed(const HfaCatalogue& catalogue) {
  std::string text;
  for (const unsigned level : catalogue.Levels())
    for (unsigned channel = 1; channel <= catalogue.pyramid.channels.size(); ++channel) {
      text += std::to_string(level) + (catalogue.IsStored(channel, level) ? "s" : "-");
      text += catalogue.IsPending(channel, level) ? "p" : "-";
    }
  return text;
}

void ReadBlocks(const std::string& path, const HfaCatalogue& catalogue) {
  for (unsigned channel = 1; channel <= kMaxChannels; ++channel)
    for (const unsigned level : catalogue.Levels())
      Try([&] { drivers::FindHfaBlockMap(path, channel, level); });
}

/// A record is set, a pending level is taken in, space is given back.
void Change(const std::string& path, const HfaCatalogue& catalogue) {
  drivers::HfaTreeChanges changes;
  changes.items["ORIN_LEVEL_2"] = "text";
  for (const auto& [level, pending] : catalogue.pending) {
    changes.level = level;
    for (unsigned i = 0; i < pending.parts.size(); ++i)
      if (pending.parts[i] != 0) changes.parts[i + 1] = pending.parts[i];
  }
  drivers::ChangeHfaTree(path, changes);
  const auto item = drivers::FindHfaItem(path, "ORIN_LEVEL_2");
  fuzz::Demand(item && item->textBytes == 5, "an item that was set is there");
}

void Compact(const std::string& path) {
  const size_t channels = drivers::ReadHfaPyramid(path).channels.size();
  const std::string before = Composed(drivers::ReadHfaCatalogue(path, channels));
  for (int pass = 0; pass < 3; ++pass)
    if (drivers::MoveHfaLevelsDown(path, drivers::FindHfaSpace(path, {})) == 0) break;
  fuzz::Demand(before == Composed(drivers::ReadHfaCatalogue(path, channels)),
               "levels that move stay levels");
}

void Remove(const std::string& path, const HfaCatalogue& catalogue) {
  const auto levels = catalogue.Levels();
  drivers::HfaTreeChanges changes;
  changes.removedLevels.assign(levels.begin(), levels.end());
  drivers::ChangeHfaTree(path, changes);
  for (const auto& names : drivers::ReadHfaPyramid(path).channels)
    for (const drivers::HfaLevelName& name : names)
      fuzz::Demand(!levels.contains(name.factor), "levels that were removed are gone");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const fuzz::ScratchFolder folder;
  const std::string path = folder.Write(kFile, data, size);
  HfaCatalogue catalogue;
  std::map<uint32_t, std::string> pixels;
  const bool isRead = Try([&] {
    catalogue = drivers::ReadHfaCatalogue(path, drivers::ReadHfaPyramid(path).channels.size());
    pixels = PixelsOf(path, catalogue.pyramid.channels.size());
  });
  if (!isRead) return 0;
  ReadBlocks(path, catalogue);
  Try([&] { Change(path, catalogue); });
  Try([&] { Compact(path); });
  Try([&] { Remove(path, catalogue); });
  Try([&] { Compact(path); });
  Demand(path, pixels);
  return 0;
}
