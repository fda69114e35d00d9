/// What a dataset answers when a run asks for its no-data value.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/auxiliarydata.h"
#include "host/datasources/levelstore.h"
#include "host/datasources/nodatafill.h"

namespace orin::datasources {

/// Drivers hand the declared text on as it stands. A run takes a decimal number, holds it as a
/// double, and converts that to the pixel type, where a negative 64-bit integer becomes 0. Values
/// that do not survive this (NaN, infinities, some 64-bit integers) get a stand-in that does not
/// occur in the image; levels store the declared value where it arrives.
class NoDataAnswers {
 public:
  /// \param source  outlives the answers
  explicit NoDataAnswers(IRasterSource& source) : source_(source) {}

  /// `declared` with decimal numbers as the texts of no-data values, or none, not in the facts
  /// either, where the declared one is no value of the type. Remembers, for `ForLevel`, what was
  /// answered for these channels. The image is searched for a stand-in once for each type that
  /// needs one.
  /// \param declared  of a reader of `channels`, which are all of type `type`
  /// \throws orin::Exception  the image cannot be opened for the search
  /// \throws orin::Cancelled  the user asked to stop it
  AuxiliaryData Answer(AuxiliaryData declared, const std::vector<unsigned>& channels,
                       const gobs::DataType& type);

  /// A level's writer as it is, or one that stores the declared value for what was answered.
  std::unique_ptr<IRasterWriter> ForLevel(std::unique_ptr<IRasterWriter> level,
                                          const std::vector<unsigned>& channels) const;

 private:
  template <class T>
  void AnswerAs(AuxiliaryData& data, const std::vector<unsigned>& channels,
                const gobs::DataType& type);
  template <class T>
  std::optional<model::NoData> AnswerTo(const std::optional<model::NoData>& declared,
                                        const gobs::DataType& type);
  std::string StandInFor(const gobs::DataType& type);

  IRasterSource& source_;
  std::vector<std::pair<gobs::DataType, std::string>> standIns_;
  std::map<std::vector<unsigned>, std::shared_ptr<const INoDataFill>> fills_;  ///< by channels
};

}  // namespace orin::datasources
