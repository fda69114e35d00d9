// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/hfalevelbuild.h"

#include <algorithm>
#include <utility>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {

HfaLevelBuild::HfaLevelBuild(const std::string& path, const HfaCatalogue& catalogue, Target target)
    : target_(std::move(target)), covered_(uint64_t{target_.width} * target_.height) {
  std::vector<HfaBlockMap> renewed;
  std::vector<unsigned> missing;
  for (const unsigned channel : target_.channels) {
    if (!catalogue.IsStored(channel, target_.level)) {
      missing.push_back(channel);
      continue;
    }
    auto map = FindHfaBlockMap(path, channel, target_.level);
    if (!map)
      throw Exception(FormatString(_("%s: level %u is damaged and cannot be written."),
                                   path.c_str(), target_.level),
                      "host/drivers/hfa/hfalevelbuild", "orin::drivers::HfaLevelBuild", 0);
    renewed.push_back(std::move(*map));
  }
  update_ = std::make_unique<HfaUpdate>(path, renewed);
  if (!missing.empty()) update_->AddLevel(target_.level, missing);
  for (const unsigned channel : target_.channels) {
    const int stored = catalogue.pyramid.Find(channel, target_.level);
    const int added = static_cast<int>(catalogue.pyramid.CountOf(channel));
    bands_.push_back(update_->LevelBand(channel, stored >= 0 ? stored : added));
  }
}

void HfaLevelBuild::Write(const gobs::Raster& block) {
  for (unsigned i = 0; i < bands_.size(); ++i)
    update_->WriteBlock(bands_[i], block, i, target_.width, target_.height);
  for (uint64_t y = block.y; y < uint64_t{block.y} + block.height; ++y) {
    const auto row = covered_.begin() + static_cast<std::ptrdiff_t>(y * target_.width);
    std::fill(row + block.x, row + block.x + block.width, true);
  }
}

bool HfaLevelBuild::IsComplete() const {
  return std::find(covered_.begin(), covered_.end(), false) == covered_.end();
}

std::map<unsigned, uint32_t> HfaLevelBuild::Store() {
  const std::unique_ptr<HfaUpdate> update = std::move(update_);
  update->Finish();
  std::map<unsigned, uint32_t> parts;
  for (const unsigned channel : target_.channels)
    parts[channel] = update->AppendPart(channel, target_.level);
  update->Keep();
  return parts;
}

}  // namespace orin::drivers
