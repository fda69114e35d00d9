/// The job: which overviews of one raster file to build, how, and where to put them.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "processes/overviews/diagnosis.h"
#include "processes/overviews/resampletype.h"

/// Holds a configuration only: every operation opens the file it needs and releases it before it
/// returns. Copies are independent.
class CreateFileOverviews {
 public:
  /// No file, factor 2.
  CreateFileOverviews();
  /// All suitable channels; factor and method as the user prefers.
  explicit CreateFileOverviews(const std::string& file);
  /// \param channels  1-based; empty means all suitable channels
  CreateFileOverviews(const std::string& file, const std::vector<unsigned>& channels);
  CreateFileOverviews(const CreateFileOverviews&);
  CreateFileOverviews& operator=(const CreateFileOverviews&);
  ~CreateFileOverviews();

  /// Builds what is missing of the job's own file. Failures are reported through the host's
  /// warnings.
  /// \returns true when all requested levels exist and are valid; false after a failure, a
  ///          cancellation or, without a warning, when the file cannot be opened or a file of its
  ///          size needs no levels, which `orin::overviews::Diagnose` tells apart
  bool Generate();
  /// Builds what is missing of several files in turn and stops at the first failure. Files that
  /// cannot be opened, and read-only ones that already have levels, are skipped. The job's file
  /// name keeps the last one.
  /// \returns false for an empty list
  bool Generate(std::vector<std::string>& files);

  /// True when the file can be opened.
  bool FileExists() const;
  /// True when the file can be opened and holds pixels.
  bool RasterDataExists() const;
  /// True when every listed channel exists; without a raster, when none is listed.
  bool ValidChannelList() const;
  /// True when a listed channel (none listed: any) is complex. Channels that the file does not have
  /// are passed over.
  bool HasComplex();

  /// true: levels go to the side-car; false: into the file, and it is an error when they cannot.
  /// Not called: into the file where that is possible.
  void SaveToKvx(bool external);
  /// \param factor  between levels: 2 or 3, else the user's preference; forgets explicit levels
  /// \param force   rebuild levels that exist and are valid
  void SetPyramidFactor(unsigned factor, bool force);
  /// \param levels  decimation factors, each 2 or more
  /// \param force   rebuild levels that exist and are valid; a level of size 0 is then an error
  void SetPyramidLevels(const std::vector<unsigned>& levels, bool force);
  /// \param type  `ResampleInvalid` means the user's preference
  void SetPyramidType(QRTOverviewResampleType type);
  /// Whether a run reports each level's start as a message.
  void ShowProgress(bool on);

 private:
  friend orin::overviews::Diagnosis orin::overviews::Diagnose(const CreateFileOverviews&);

  bool OpenDataset(const std::string& name, orin::datasources::IDataset** out) const;
  bool GetLevelsToCompute(orin::datasources::IDataset* dataset,
                          std::vector<unsigned int>& levels) const;
  bool GenerateListed();
  bool CreateOverviews(orin::datasources::IDataset** dataset, bool readOnly, std::string fileName,
                       QRTOverviewResampleType type, std::vector<unsigned>& levels);

  std::string fileName_;
  QRTOverviewResampleType type_;
  unsigned factor_;
  bool external_ = true;
  bool automatic_ = true;
  std::vector<unsigned> levels_;
  bool force_ = false;
  bool progress_ = true;
  std::vector<unsigned> channels_;
};
