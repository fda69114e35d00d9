// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelfile.h"

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <utility>
#include <vector>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

constexpr char kPartial[] = ".partial";

std::vector<uint8_t> EmptyHeader(const TiffStructure& structure) {
  std::vector<uint8_t> header(structure.HeaderBytes());
  header[0] = header[1] = structure.byteOrder.order == std::endian::little ? 'I' : 'M';
  structure.byteOrder.Put(structure.isBig ? TIFF_VERSION_BIG : TIFF_VERSION_CLASSIC, 2, &header[2]);
  if (structure.isBig) structure.byteOrder.Put(structure.LinkBytes(), 2, &header[4]);
  return header;
}

std::vector<uint64_t> OffsetsIn(const TiffStructure& structure) {
  std::vector<uint64_t> offsets;
  for (const TiffDirectory& directory : structure.directories) offsets.push_back(directory.offset);
  return offsets;
}

/// True for a header that links to no directory, and for none, with nothing behind it.
bool IsStartOfSideCar(const std::vector<uint8_t>& start) {
  for (const bool isBig : {false, true})
    for (const std::endian order : {std::endian::little, std::endian::big}) {
      TiffStructure structure;
      structure.isBig = isBig;
      structure.byteOrder.order = order;
      std::vector<uint8_t> header = EmptyHeader(structure);
      header.resize(start.size());
      if (start == header) return true;
    }
  return std::count(start.begin(), start.end(), 0) == std::ptrdiff_t(start.size());
}

/// Also for a link that leads nowhere.
bool IsThere(const std::string& path) {
  std::error_code ignored;
  return std::filesystem::exists(std::filesystem::symlink_status(path, ignored));
}

[[noreturn]] void Refuse(const char* format, const std::string& path) {
  throw Exception(FormatString(format, path.c_str()), "host/drivers/tiff/levelfile", "LevelFile",
                  0);
}

[[noreturn]] void RefuseForeign(const std::string& path) {
  Refuse(_("%s: belongs to another user, who could read what is written to it. Delete it, or move "
           "it away, and run again."),
         path);
}

}  // namespace

LevelFile::LevelFile(std::string path, bool mayChange)
    : path_(std::move(path)),
      mayChange_(mayChange),
      isMade_(true),
      file_(std::make_unique<PositionedFile>(path_, PositionedFile::Mode::kRead)) {
  // Who opens the file later knows its state of now. Where the system does not tell who has opened
  // it before, space is reused once it was free for a whole build.
  mayReuse_ = mayChange && file_->DoAlone([] {}) != PositionedFile::Alone::kOthersHaveItOpen;
  structure_ = ParseStructure(*file_);
}

std::unique_ptr<LevelFile> LevelFile::Beside(const std::string& imageFile, std::string path) {
  const bool isThere = IsThere(path);
  std::unique_ptr<LevelFile> file(isThere ? new LevelFile(path, true) : new LevelFile());
  file->path_ = std::move(path);
  file->access_ = FileAccess::Of(imageFile);
  file->mayChange_ = true;
  return file;
}

void LevelFile::Refresh() {
  if (isMade_) structure_ = ParseStructure(*file_);
}

std::unique_ptr<PositionedFile> LevelFile::OpenLocked() const {
  using Mode = PositionedFile::Mode;
  auto file =
      std::make_unique<PositionedFile>(path_, access_ ? Mode::kUpdateUnlinked : Mode::kUpdate);
  if (access_ && !file->IsReadableAs(*access_)) RefuseForeign(path_);
  file->Lock();
  return file;
}

void LevelFile::OpenForChange() {
  if (appender_) return;
  if (!mayChange_)
    throw Exception(
        FormatString(_("%s: is open for reading only; no level can be written."), path_.c_str()),
        "host/drivers/tiff/levelfile", "LevelFile::OpenForChange()", 0);
  if (isMade_) {
    file_ = OpenLocked();
    const std::vector<uint64_t> known = OffsetsIn(structure_);
    Refresh();  // another program may have changed the chain before
    mayReuse_ = mayReuse_ && OffsetsIn(structure_) == known;
  } else {
    Make();
  }
  StartAppending();
}

void LevelFile::StartAppending() {
  FreeSpaceMap map = isMade_ ? FindFreeSpace(*file_, structure_) : FreeSpaceMap();
  if (!mayReuse_) map.free = {};
  appender_ =
      std::make_unique<Appender>(*file_, structure_.isBig, structure_.byteOrder, std::move(map));
}

/// What bears the name of a file that is being made, locked; null when there is nothing. It was
/// begun by this program for this user: it has the first marker, or nothing but a header without a
/// directory.
/// \throws orin::Exception  it is something else
std::unique_ptr<PositionedFile> LevelFile::OpenUnfinished() const {
  const std::string path = path_ + kPartial;
  if (!IsThere(path)) return nullptr;
  auto partial = std::make_unique<PositionedFile>(path, PositionedFile::Mode::kUpdateUnlinked);
  if (!partial->IsOwn()) RefuseForeign(path);
  partial->Lock();
  std::vector<uint8_t> start(std::min<uint64_t>(partial->Size(), 2 * kMarkerBytes));
  partial->Read(0, start.data(), start.size());
  start.resize(2 * kMarkerBytes);
  if (!IsStartOfSideCar(start) && !ReadMarker(*partial, kMarkerBytes))
    Refuse(_("%s: is no side-car that a build left behind. Delete it, or move it away, and run "
             "again."),
           path);
  return partial;
}

/// What a build that was killed left behind is not written over: others may have it open.
void LevelFile::Make() {
  if (IsThere(path_)) Refuse(_("%s: was made by another program just now. Run again."), path_);
  if (const auto unfinished = OpenUnfinished()) unfinished->Remove();
  auto made = PositionedFile::Make(path_ + kPartial, *access_);
  made->Lock();
  if (IsThere(path_)) {
    made->Remove();
    Refuse(_("%s: was made by another program just now. Run again."), path_);
  }
  file_ = std::move(made);
  const std::vector<uint8_t> header = EmptyHeader(structure_);
  file_->Write(0, header.data(), header.size());
}

Appender& LevelFile::ToAppend() {
  OpenForChange();
  return *appender_;
}

PositionedFile& LevelFile::ToChange() {
  OpenForChange();
  return *file_;
}

void LevelFile::Overwrite(uint64_t position, const std::string& bytes) {
  OpenForChange();
  file_->Write(position, bytes.data(), bytes.size());
}

void LevelFile::Sync() {
  OpenForChange();
  file_->Sync();
}

int64_t LevelFile::SetModified(int64_t nanoseconds) {
  OpenForChange();
  return file_->SetModified(nanoseconds);
}

/// A cloud-optimized file says in a text behind its header that it keeps a certain order; this one
/// will not any more. The text has a blank for the longer word.
void LevelFile::DeclareEdited() {
  constexpr size_t kMostBytes = 4096;
  const std::string before = "KNOWN_INCOMPATIBLE_EDITION=NO\n ";
  const std::string after = "KNOWN_INCOMPATIBLE_EDITION=YES\n";
  const uint64_t start = structure_.HeaderBytes();
  const uint64_t size = file_->Size();
  std::string text(std::min<uint64_t>(kMostBytes, size - std::min(size, start)), '\0');
  file_->Read(start, text.data(), text.size());
  if (!text.starts_with("GDAL_STRUCTURAL_METADATA_SIZE=")) return;
  const size_t at = text.find(before);
  if (at != text.npos) file_->Write(start + at, after.data(), after.size());
}

void LevelFile::Link(const Place& place, uint64_t directory) {
  OpenForChange();
  appender_->Close();
  file_->Sync();
  if (isMade_) DeclareEdited();
  Keep();  // first: a link that fails half-way may point there already
  appender_->Link(place.linkPosition, directory);
  file_->Sync();
  if (!isMade_) {
    file_->Rename(path_);
    isMade_ = true;
  }
  structure_ = ParseStructure(*file_);
}

void LevelFile::Keep() {
  if (appender_) appender_->Keep();
}

void LevelFile::CutBackTo(uint64_t end) {
  if (!appender_) return;
  if (isMade_) {
    appender_->CutBackTo(end);
    return;
  }
  std::remove(file_->Path().c_str());
  appender_.reset();
  file_.reset();
}

void LevelFile::Delete() {
  OpenForChange();
  file_->Remove();
  appender_.reset();
  file_.reset();
  isMade_ = false;
  structure_.directories.clear();
}

void LevelFile::DeleteUnfinished() {
  if (isMade_ || file_) return;
  if (const auto unfinished = OpenUnfinished()) unfinished->Remove();
}

void LevelFile::Relink(uint64_t position, uint64_t offset) {
  OpenForChange();
  DeclareEdited();
  appender_->Link(position, offset);
  file_->Sync();
}

/// Of an image's own file the first directory stays where it is, whatever its markers say.
Compactor LevelFile::CompactorOf() const { return Compactor(*file_, access_ ? 0 : 1); }

bool LevelFile::HasReclaimableSpace() const { return isMade_ && CompactorOf().IsWorthwhile(); }

void LevelFile::Reclaim() {
  if (!appender_ || !isMade_) return;
  CompactorOf().Compact();
  structure_ = ParseStructure(*file_);
  mayReuse_ = false;  // somebody may have opened the file meanwhile
  StartAppending();
}

void LevelFile::CutOff(const ByteRanges& given) {
  OpenForChange();
  CompactorOf().CutOff(given);
  structure_ = ParseStructure(*file_);
  mayReuse_ = false;  // somebody may still read what was removed
  StartAppending();
}

}  // namespace orin::drivers
