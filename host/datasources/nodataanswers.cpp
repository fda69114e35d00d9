// SPDX-License-Identifier: MIT
#include "host/datasources/nodataanswers.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <limits>

#include "basic/core/typedispatch/pixeltypes.h"
#include "basic/gobs/cancelled.h"
#include "host/datasources/nodatastandin.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

std::string TextOf(double value) {
  std::array<char, 32> text;
  return {text.data(), std::to_chars(text.data(), text.data() + text.size(), value).ptr};
}

/// Whether a run that reads the decimal number as a double fills with `value`.
template <class T>
bool Survives(const model::NoData& noData, T value) {
  if constexpr (std::is_floating_point_v<T>) return std::isfinite(value);
  else if constexpr (sizeof(T) < 8) return true;
  else {
    constexpr double kMax = static_cast<double>(std::numeric_limits<T>::max());  // one above it
    if (value < 0) return false;
    return noData.Number() >= kMax ? value == std::numeric_limits<T>::max()
                                   : static_cast<T>(noData.Number()) == value;
  }
}

}  // namespace

std::string NoDataAnswers::StandInFor(const gobs::DataType& type) {
  for (const auto& [known, text] : standIns_)
    if (known == type) return text;
  bool stopped = false;
  const std::string text = TextOf(FindNoDataStandIn(source_, type, stopped));
  if (stopped)
    throw Cancelled(_("The search for a substitute no-data value was stopped."),
                    "host/datasources/nodataanswers",
                    "std::string NoDataAnswers::StandInFor(const gobs::DataType&)", 0);
  standIns_.emplace_back(type, text);
  return text;
}

/// Nothing for what no pixel can equal, unless it is a decimal number.
template <class T>
std::optional<model::NoData> NoDataAnswers::AnswerTo(const std::optional<model::NoData>& declared,
                                                     const gobs::DataType& type) {
  if (!declared) return std::nullopt;
  const auto value = declared->As<T>();
  if (value && !Survives(*declared, value->stored))
    return model::NoData::Parse(StandInFor(type), declared->Origin());
  return declared->Decimal().empty() ? std::nullopt : declared;
}

template <class T>
void NoDataAnswers::AnswerAs(AuxiliaryData& data, const std::vector<unsigned>& channels,
                             const gobs::DataType& type) {
  const auto textOf = [](const std::optional<model::NoData>& answer) {
    return answer ? answer->Decimal() : "";
  };
  model::SourceFacts& facts = data.Facts();
  facts.channels.resize(channels.size());
  const auto file = AnswerTo<T>(facts.noData, type);
  data.SetFileMetadataValue(kNoDataKey, textOf(file));
  if (!file) facts.noData.reset();
  NoDataOfPass pass{file, facts.noData, {}};
  for (unsigned channel = 1; channel <= channels.size(); ++channel) {
    std::optional<model::NoData>& declared = facts.channels[channel - 1].noData;
    const auto own = AnswerTo<T>(declared, type);
    data.SetChanMetadataValue(kNoDataKey, channel, textOf(own));
    if (!own) declared.reset();
    pass.declared.push_back(own ? declared : facts.noData);
    if (channel == 1 && !file) {
      pass.answered = own;
      pass.fill = declared;
    }
  }
  fills_[channels] = MakeNoDataFill(pass, type);
}

AuxiliaryData NoDataAnswers::Answer(AuxiliaryData declared, const std::vector<unsigned>& channels,
                                    const gobs::DataType& type) {
  fills_.erase(channels);
  typedispatch::WithPixelType(
      type, [&]<class T>(std::type_identity<T>) { AnswerAs<T>(declared, channels, type); });
  return declared;
}

std::unique_ptr<IRasterWriter> NoDataAnswers::ForLevel(
    std::unique_ptr<IRasterWriter> level, const std::vector<unsigned>& channels) const {
  const auto fill = fills_.find(channels);
  if (fill == fills_.end() || !fill->second || !level) return level;
  return WithNoDataFill(std::move(level), fill->second);
}

}  // namespace orin::datasources
