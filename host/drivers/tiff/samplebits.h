/// Samples of 1 to 31 bits: from the packed rows of a file to whole bytes, and back.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

namespace orin::drivers {

/// Spreads `count` packed samples. One call a row: packed rows start at a byte boundary.
/// \param packed          most significant bit first; 24-bit samples are three bytes in the
///                        machine's order, because libtiff treats them as numbers, not as a string
///                        of bits
/// \param bits            of a packed sample, 1 to 31
/// \param isSigned        the samples are in two's complement: the sign is extended
/// \param bytesPerSample  of `samples`: 1, 2 or 4, and at least `bits` wide
void UnpackSamples(const uint8_t* packed, uint32_t bits, uint64_t count, bool isSigned,
                   uint8_t* samples, uint32_t bytesPerSample);

/// The reverse; a value that `bits` cannot hold becomes the nearest that they can. The last byte of
/// the row is filled up with zero bits.
/// \param packed  receives PackedBytes(count, bits) bytes
void PackSamples(const uint8_t* samples, uint32_t bytesPerSample, uint64_t count, uint32_t bits,
                 bool isSigned, uint8_t* packed);

/// Bytes of a packed row.
constexpr uint64_t PackedBytes(uint64_t count, uint32_t bits) { return (count * bits + 7) / 8; }

}  // namespace orin::drivers
