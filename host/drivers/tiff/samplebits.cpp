// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/samplebits.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <limits>
#include <type_traits>

namespace orin::drivers {
namespace {

constexpr uint32_t kBytewiseBits = 24;  // the one width that is kept in the machine's byte order

template <class T>
T Load(const uint8_t* from) {
  T value;
  std::memcpy(&value, from, sizeof value);
  return value;
}

template <class T>
void Store(uint8_t* to, T value) {
  std::memcpy(to, &value, sizeof value);
}

/// `value` as a number of T; for a signed T the top one of the `bits` is the sign.
template <class T>
T Widen(uint32_t value, uint32_t bits) {
  if constexpr (std::is_signed_v<T>) {
    const uint32_t sign = 1u << (bits - 1);
    return static_cast<T>(static_cast<int32_t>((value ^ sign) - sign));
  } else {
    return static_cast<T>(value);
  }
}

template <class T>
uint32_t Narrow(T value, uint32_t bits) {
  constexpr bool kSigned = std::is_signed_v<T>;
  const int64_t highest = (int64_t{1} << (bits - (kSigned ? 1 : 0))) - 1;
  const int64_t lowest = kSigned ? -highest - 1 : 0;
  const int64_t clamped = std::clamp<int64_t>(value, lowest, highest);
  return static_cast<uint32_t>(clamped) & ((1u << bits) - 1);
}

constexpr int ByteShift(int byte) {
  return std::endian::native == std::endian::little ? 8 * byte : 16 - 8 * byte;
}

template <class T>
void Unpack(const uint8_t* packed, uint32_t bits, uint64_t count, uint8_t* samples) {
  const uint32_t mask = (1u << bits) - 1;
  uint64_t window = 0;  // the bits read and not yet handed out are its lowest
  uint32_t held = 0;
  for (uint64_t i = 0; i < count; ++i) {
    for (; held < bits; held += 8) window = window << 8 | *packed++;
    held -= bits;
    Store<T>(samples + i * sizeof(T), Widen<T>(static_cast<uint32_t>(window >> held) & mask, bits));
  }
}

template <class T>
void Pack(const uint8_t* samples, uint64_t count, uint32_t bits, uint8_t* packed) {
  uint64_t window = 0;
  uint32_t held = 0;
  for (uint64_t i = 0; i < count; ++i) {
    window = window << bits | Narrow<T>(Load<T>(samples + i * sizeof(T)), bits);
    for (held += bits; held >= 8; held -= 8) *packed++ = static_cast<uint8_t>(window >> (held - 8));
  }
  if (held > 0) *packed = static_cast<uint8_t>(window << (8 - held));
}

template <class T>
void UnpackBytewise(const uint8_t* packed, uint64_t count, uint8_t* samples) {
  for (uint64_t i = 0; i < count; ++i, packed += 3) {
    uint32_t value = 0;
    for (int byte = 0; byte < 3; ++byte) value |= uint32_t{packed[byte]} << ByteShift(byte);
    Store<T>(samples + i * sizeof(T), Widen<T>(value, kBytewiseBits));
  }
}

template <class T>
void PackBytewise(const uint8_t* samples, uint64_t count, uint8_t* packed) {
  for (uint64_t i = 0; i < count; ++i, packed += 3) {
    const uint32_t value = Narrow<T>(Load<T>(samples + i * sizeof(T)), kBytewiseBits);
    for (int byte = 0; byte < 3; ++byte)
      packed[byte] = static_cast<uint8_t>(value >> ByteShift(byte));
  }
}

/// Calls `visit(T{})` for the integer type of that width and signedness.
template <class Visitor>
void WithInteger(uint32_t bytes, bool isSigned, Visitor&& visit) {
  if (bytes == 1) isSigned ? visit(int8_t{}) : visit(uint8_t{});
  else if (bytes == 2) isSigned ? visit(int16_t{}) : visit(uint16_t{});
  else isSigned ? visit(int32_t{}) : visit(uint32_t{});
}

}  // namespace

void UnpackSamples(const uint8_t* packed, uint32_t bits, uint64_t count, bool isSigned,
                   uint8_t* samples, uint32_t bytesPerSample) {
  WithInteger(bytesPerSample, isSigned, [&]<class T>(T) {
    bits == kBytewiseBits ? UnpackBytewise<T>(packed, count, samples)
                          : Unpack<T>(packed, bits, count, samples);
  });
}

void PackSamples(const uint8_t* samples, uint32_t bytesPerSample, uint64_t count, uint32_t bits,
                 bool isSigned, uint8_t* packed) {
  WithInteger(bytesPerSample, isSigned, [&]<class T>(T) {
    bits == kBytewiseBits ? PackBytewise<T>(samples, count, packed)
                          : Pack<T>(samples, count, bits, packed);
  });
}

}  // namespace orin::drivers
