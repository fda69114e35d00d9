// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfacompactor.h"

#include <algorithm>
#include <map>
#include <span>
#include <vector>

#include "host/drivers/hfa/patchedfile.h"

namespace orin::drivers {
namespace {

/// Where things go.
class Moves {
 public:
  /// Chooses places for what can move down. Large things first: they fit into fewer.
  explicit Moves(HfaSpace& space) {
    auto& all = space.movables;
    std::stable_sort(all.begin(), all.end(),
                     [](const auto& a, const auto& b) { return a.bytes > b.bytes; });
    for (auto first = all.begin(); first != all.end();) {
      const auto last = std::find_if(
          first, all.end(), [&](const auto& other) { return other.bytes != first->bytes; });
      PlaceAlike({first, last}, space.free);
      first = last;
    }
  }

  struct Move {
    uint32_t bytes, to;
  };
  const std::map<uint32_t, Move>& All() const { return moves_; }

  /// Where what stands at `position` will stand.
  uint32_t Moved(uint32_t position) const {
    auto at = moves_.upper_bound(position);
    if (at == moves_.begin()) return position;
    const auto& [from, move] = *--at;
    return position - from < move.bytes ? move.to + (position - from) : position;
  }

 private:
  /// Things of one size, ascending: as many as can go to a lower place, the last ones, so that no
  /// more move than there are places, and their order stays.
  void PlaceAlike(std::span<const HfaMovable> alike, ByteRanges& free) {
    const uint32_t bytes = alike.front().bytes;
    std::vector<uint32_t> places;
    while (places.size() < alike.size()) {
      const auto place = free.TakeBefore(alike.back().position, bytes);
      if (!place) break;
      places.push_back(static_cast<uint32_t>(*place));
    }
    const auto fits = [&](size_t count) {
      const auto last = alike.last(count);
      for (size_t i = 0; i < count; ++i)
        if (places[i] >= last[i].position) return false;
      return true;
    };
    size_t count = 0, tooMany = places.size() + 1;
    while (count + 1 < tooMany) {
      const size_t middle = (count + tooMany) / 2;
      (fits(middle) ? count : tooMany) = middle;
    }
    for (size_t i = 0; i < count; ++i) moves_[alike.last(count)[i].position] = {bytes, places[i]};
    for (size_t i = count; i < places.size(); ++i)
      free.Add({places[i], uint64_t{places[i]} + bytes});
  }

  std::map<uint32_t, Move> moves_;
};

/// What stands at `from`, as it is where it goes: its own pointers lead to where things will be.
std::string CopyOf(PatchedFile& file, uint32_t from, uint32_t count, const HfaSpace& space,
                   const Moves& moves) {
  std::string bytes(count, '\0');  // what the file ends before was never written
  file.Read(from, bytes.data(), bytes.size());
  const auto first = std::lower_bound(
      space.pointers.begin(), space.pointers.end(), from,
      [](const HfaPointer& pointer, uint32_t at) { return pointer.position < at; });
  for (auto at = first; at != space.pointers.end() && at->position - from + 4 <= count; ++at)
    PutHfaNumber(bytes, at->position - from, moves.Moved(at->value));
  return bytes;
}

}  // namespace

uint64_t MoveHfaLevelsDown(const std::string& path, HfaSpace space) {
  const Moves moves(space);
  if (moves.All().empty()) return 0;
  PatchedFile file(path);
  uint64_t moved = 0;
  for (const auto& [from, move] : moves.All()) {
    const std::string bytes = CopyOf(file, from, move.bytes, space, moves);
    file.WriteNow(move.to, bytes.data(), bytes.size());
    moved += bytes.size();
  }
  file.Sync();
  std::string number(4, '\0');
  for (const HfaPointer& pointer : space.pointers) {
    const uint32_t value = moves.Moved(pointer.value);
    // Pointers in what moves change in the copy alone: those in the original lead to originals.
    if (value == pointer.value || moves.Moved(pointer.position) != pointer.position) continue;
    PutHfaNumber(number, 0, value);
    file.WriteNow(pointer.position, number.data(), number.size());
  }
  file.Sync();
  return moved;
}

bool HfaCompactor::IsWorthIt(const ByteRanges& freed) const {
  return FindHfaSpace(file_.Path(), freed).free.Size() > 0;
}

void HfaCompactor::Compact(const ByteRanges& freed) const {
  constexpr int kMaxPasses = 12;          // what one pass leaves room for, the next one moves
  constexpr uint64_t kWorthAPass = 1024;  // that the last one moved
  const auto isAlone = [&] { return file_.DoAlone([] {}) == PositionedFile::Alone::kDone; };
  for (int pass = 0; pass < kMaxPasses && isAlone(); ++pass)
    if (MoveHfaLevelsDown(file_.Path(), FindHfaSpace(file_.Path(), freed)) < kWorthAPass) break;
  Cut(freed);
}

void HfaCompactor::Cut(const ByteRanges& freed) const {
  const HfaSpace space = FindHfaSpace(file_.Path(), freed);
  if (space.end >= space.size) return;
  file_.DoAlone([&] {
    if (file_.Size() != space.size) return;
    file_.Truncate(space.end);
    file_.Sync();
  });
}

}  // namespace orin::drivers
