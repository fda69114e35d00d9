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
#include "host/datasources/nodatavalue.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

std::string TextOf(double value) {
  std::array<char, 32> text;
  return {text.data(), std::to_chars(text.data(), text.data() + text.size(), value).ptr};
}

/// Whether a run that reads this text as a double fills with `value`.
template <class T>
bool Survives(const std::string& text, T value) {
  const double number = ParseNoData(text).value_or(0);
  if constexpr (std::is_floating_point_v<T>) return std::isfinite(value);
  else if constexpr (sizeof(T) < 8) return true;
  else {
    constexpr double kMax = static_cast<double>(std::numeric_limits<T>::max());  // one above it
    if (value < 0) return false;
    return number >= kMax ? value == std::numeric_limits<T>::max()
                          : static_cast<T>(number) == value;
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

/// Empty for what is no number and for what no pixel can equal but by being a decimal number.
template <class T>
std::string NoDataAnswers::AnswerTo(const std::string& declared, const gobs::DataType& type) {
  const std::string plain = PlainNoDataText(declared);
  const auto value = NoDataValueOf<T>(declared);
  if (!value || Survives(plain, value->stored)) return plain;
  return StandInFor(type);
}

template <class T>
void NoDataAnswers::AnswerAs(AuxiliaryData& data, const std::vector<unsigned>& channels,
                             const gobs::DataType& type) {
  NoDataTexts texts;
  const std::string file = data.GetFileMetadataValue(kNoDataKey);
  const std::string fileAnswer = AnswerTo<T>(file, type);
  data.SetFileMetadataValue(kNoDataKey, fileAnswer);
  const auto declared = [](const std::string& text, const std::string& answer) {
    return answer == PlainNoDataText(text) ? "" : text;
  };
  data.SetFileMetadataValue(kDeclaredNoDataKey, declared(file, fileAnswer));
  texts.answered = fileAnswer;
  texts.fill = file;
  for (unsigned channel = 1; channel <= channels.size(); ++channel) {
    const std::string own = data.GetChanMetadataValue(kNoDataKey, channel);
    const std::string answer = AnswerTo<T>(own, type);
    data.SetChanMetadataValue(kNoDataKey, channel, answer);
    data.SetChanMetadataValue(kDeclaredNoDataKey, channel, declared(own, answer));
    texts.declared.push_back(answer.empty() ? file : own);
    if (channel == 1 && fileAnswer.empty()) {
      texts.answered = answer;
      texts.fill = own;
    }
  }
  fills_[channels] = MakeNoDataFill(texts, type);
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
