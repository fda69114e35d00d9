/// The record that a driver keeps with every level it stores: how the level was made, from what,
/// and what its stored bytes are.
// SPDX-License-Identifier: MIT
//
// One record for all drivers. A driver stores the items of `ComposeRecord` wherever its format
// keeps named texts, and hands them back to `ParseRecord`:
//
//   TIFF   one item each of the level's metadata tag
//   HFA    one line per level, see `LineOf`, in the file's metadata
//
// Three items change after the level is linked. Their texts have a fixed width, so that one
// positioned write over the old text does it: kValidityItem, kImageItem, kContentItem.
//
// The life of a record:
//   1. level created     method, factor, source, program, inputs; no channel valid;
//                        image = {fingerprint of the data that is read, blank stamp}
//   2. level linked      content = {digests of what is stored, blank stamp}
//   3. level valid       validity of the finished channels
//   4. store closed      stamps of image and holder, the last bytes written to the file
// A step that is missing after a kill makes the next question read the image or the level; it
// never makes an answer wrong.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/model/levelinputs.h"
#include "host/model/stamps.h"

namespace orin::model {

/// Characters of a record's validity, one a channel.
inline constexpr char kAbsent = '-';   ///< the channel was not created
inline constexpr char kInvalid = '0';  ///< created, not finished
inline constexpr char kValid = '1';

/// Characters of a digest or a fingerprint: lower-case hexadecimal digits.
inline constexpr size_t kDigestLength = 32;

struct ImageRecord {
  std::string fingerprint;  ///< of the image's stored data; empty when it is unknown
  ImageStamp stamp;         ///< of a moment when the image held that data; may be blank

  bool IsBlank() const { return fingerprint.empty(); }
  friend bool operator==(const ImageRecord&, const ImageRecord&) = default;
};

/// What a level stores, its mask included. Where in the file it stands does not count.
struct ContentRecord {
  std::string table;  ///< digest of the sizes of its tiles and of the tags that give them meaning
  std::string bytes;  ///< digest of its stored bytes: the level's generation; empty when unknown
  FileStamp holder;   ///< of the file that holds it, when it held these bytes; may be blank

  bool IsBlank() const { return bytes.empty(); }
  friend bool operator==(const ContentRecord&, const ContentRecord&) = default;
};

struct LevelRecord {
  /// 0: none, another program's level. 1: written before inputs and content were recorded; what
  /// cannot be compared cannot be proved, so such a level is stale, unfinished or unverified.
  /// 2: everything below.
  int version = 0;
  std::string method;        ///< "NEAREST" ...; may be empty
  unsigned level = 0;        ///< decimation factor; 0 when unknown
  unsigned sourceLevel = 0;  ///< level it was computed from, 1 for the image; 0 unknown
  std::string sourceBytes;   ///< `ContentRecord::bytes` of that level; empty for the image
  std::string program;       ///< name and version
  std::string validity;      ///< one character a channel; empty without a record
  LevelInputs inputs;
  ImageRecord image;
  ContentRecord content;

  friend bool operator==(const LevelRecord&, const LevelRecord&) = default;
};

/// True when every channel is finished. Absent ones count: other programs show them empty.
bool IsFinished(const LevelRecord& record);
bool HasValidChannel(const LevelRecord& record);

// Names of items. RESAMPLING is the one that raster programs know.
inline constexpr char kMethodItem[] = "RESAMPLING";
inline constexpr char kFactorItem[] = "ORIN_FACTOR";
inline constexpr char kSourceItem[] = "ORIN_SOURCE_LEVEL";
inline constexpr char kSourceBytesItem[] = "ORIN_SOURCE_BYTES";
inline constexpr char kProgramItem[] = "ORIN_PROGRAM";
inline constexpr char kValidityItem[] = "ORIN_VALID";
inline constexpr char kInputsItem[] = "ORIN_INPUTS";
inline constexpr char kImageItem[] = "ORIN_IMAGE";
inline constexpr char kContentItem[] = "ORIN_CONTENT";

using RecordItem = std::pair<std::string, std::string>;  ///< name and text

/// The items of a record of version 2, whatever `record.version` says, in a fixed order.
std::vector<RecordItem> ComposeRecord(const LevelRecord& record);
/// What can be understood of the items, also of another program's; of two with one name the last
/// counts. A validity that is not made of the three characters counts as none.
LevelRecord ParseRecord(const std::vector<RecordItem>& items);

/// Characters of the two items, whatever they hold.
inline constexpr size_t kImageTextLength = 2 + kDigestLength + 1 + kImageStampTextLength;
inline constexpr size_t kContentTextLength = 2 + 2 * (kDigestLength + 1) + kFileStampLength;

/// "2 FINGERPRINT STAMP"; dashes for a blank record. Plain ASCII of kImageTextLength.
std::string TextOf(const ImageRecord& image);
/// "2 TABLE BYTES STAMP"; dashes for a blank record. Plain ASCII of kContentTextLength.
std::string TextOf(const ContentRecord& content);

/// All items in one line, for formats that keep one text a level: "NAME=TEXT|NAME=TEXT|...".
std::string LineOf(const LevelRecord& record);
LevelRecord ParseLine(const std::string& line);
/// Where in a line of `LineOf` the text of an item begins; none when the line lacks it.
std::optional<size_t> TextAt(const std::string& line, const std::string& name);

}  // namespace orin::model
