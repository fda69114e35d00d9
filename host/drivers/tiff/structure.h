/// The structure of a TIFF file: header, chain of directories, entries. Pixels are not its
/// business.
// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <bit>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "host/drivers/common/positionedfile.h"

namespace orin::drivers {

/// Numbers of a file in its byte order, to and from the machine's.
struct ByteOrder {
  std::endian order = std::endian::native;

  bool IsSwapped() const { return order != std::endian::native; }
  /// \param width  bytes, 1 to 8
  uint64_t Number(const uint8_t* bytes, unsigned width) const;
  void Put(uint64_t number, unsigned width, uint8_t* bytes) const;
  /// Turns `bytes` round, element by element, when the order is not the machine's.
  void Swap(std::vector<uint8_t>& bytes, unsigned elementBytes) const;
};

/// One entry whose value lies completely inside the file.
struct TiffEntry {
  uint16_t tag = 0;
  uint16_t type = 0;               ///< one of the TIFF types
  uint64_t count = 0;              ///< elements
  uint64_t position = 0;           ///< of the value, in the file
  uint64_t bytes = 0;              ///< of the value
  std::array<uint8_t, 8> field{};  ///< the entry's last bytes: the value where it fits there
};

struct TiffDirectory {
  uint64_t offset = 0;
  uint64_t linkPosition = 0;  ///< of the field that links to the next directory
  uint64_t next = 0;          ///< 0 where the chain ends, whatever a dangling link says
  std::vector<TiffEntry> entries;

  /// The first entry of that tag, or null.
  const TiffEntry* Find(uint16_t tag) const;
};

struct TiffStructure {
  bool isBig = false;
  ByteOrder byteOrder;
  std::vector<TiffDirectory> directories;  ///< in the order of the chain
  /// The chain did not end where it was left: at a link that leads nowhere, or back, or behind the
  /// last directory that is read. The file may refer to more than is known.
  bool isBroken = false;

  unsigned LinkBytes() const { return isBig ? 8 : 4; }
  unsigned HeaderBytes() const { return isBig ? 16 : 8; }
  /// Position of the link to the first directory.
  uint64_t HeadLinkPosition() const { return isBig ? 8 : 4; }
};

/// Bytes of one element of a TIFF type; 0 for an unknown type.
unsigned ElementBytes(uint16_t type);
/// Bytes of the units that a byte order turns round: half an element for rationals.
unsigned SwapBytes(uint16_t type);

/// Follows the chain of directories, of which 65535 are read, as many as other programs can number.
/// A link that points at nothing valid, or back, ends it, and so
/// do directories that together are larger than the file: they overlap. Nothing is read outside the
/// file, and no more is allocated than a few times what the file holds.
/// \throws orin::Exception  the header or the first directory is not one of a TIFF file
TiffStructure ParseStructure(const PositionedFile& file);

/// A directory of any kind, also one without an image, at `offset`; none when there is no valid
/// one.
std::optional<TiffDirectory> ReadDirectoryAt(const PositionedFile& file,
                                             const TiffStructure& structure, uint64_t offset);

/// The value's bytes, elements in the machine's byte order.
std::vector<uint8_t> ReadBytes(const PositionedFile& file, const TiffStructure& structure,
                               const TiffEntry& entry);
/// The values of an unsigned integer entry (BYTE, SHORT, LONG, LONG8, IFD); empty for other types.
std::vector<uint64_t> ReadNumbers(const PositionedFile& file, const TiffStructure& structure,
                                  const TiffEntry& entry);
/// Hands the same values over in turn, however many there are, in little memory.
void VisitNumbers(const PositionedFile& file, const TiffStructure& structure,
                  const TiffEntry& entry, const std::function<void(uint64_t)>& visit);
/// The first value of an unsigned integer tag, or `otherwise`.
uint64_t NumberOf(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, uint16_t tag, uint64_t otherwise);

}  // namespace orin::drivers
