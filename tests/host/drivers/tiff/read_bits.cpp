/// Packing and unpacking of samples of 1 to 31 bits.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "host/drivers/tiff/samplebits.h"

namespace orin::drivers {
namespace {

using Bytes = std::vector<uint8_t>;

template <class T>
std::vector<T> Unpacked(const Bytes& packed, uint32_t bits, uint64_t count) {
  std::vector<T> samples(count);
  UnpackSamples(packed.data(), bits, count, std::is_signed_v<T>,
                reinterpret_cast<uint8_t*>(samples.data()), sizeof(T));
  return samples;
}

template <class T>
Bytes Packed(const std::vector<T>& samples, uint32_t bits) {
  Bytes packed(PackedBytes(samples.size(), bits), 0xEE);
  PackSamples(reinterpret_cast<const uint8_t*>(samples.data()), sizeof(T), samples.size(), bits,
              std::is_signed_v<T>, packed.data());
  return packed;
}

TEST(Unpack, ReadsFromTheMostSignificantBit) {
  EXPECT_EQ((std::vector<uint8_t>{1, 0, 1, 1, 0, 0, 0, 0, 1}),
            Unpacked<uint8_t>({0xB0, 0x80}, 1, 9));
  EXPECT_EQ((std::vector<uint8_t>{0xA, 0xB, 0xC}), Unpacked<uint8_t>({0xAB, 0xC0}, 4, 3));
  EXPECT_EQ((std::vector<uint16_t>{0xABC, 0xDEF}), Unpacked<uint16_t>({0xAB, 0xCD, 0xEF}, 12, 2));
}

TEST(Unpack, ExtendsTheSign) {
  EXPECT_EQ((std::vector<int8_t>{-8, 7, -1}), Unpacked<int8_t>({0x87, 0xF0}, 4, 3));
  EXPECT_EQ((std::vector<int16_t>{-2048, 2047}), Unpacked<int16_t>({0x80, 0x07, 0xFF}, 12, 2));
}

TEST(Pack, ClampsWhatTheBitsCannotHold) {
  EXPECT_EQ((Bytes{0xFF, 0xF0, 0x05}), Packed<uint16_t>({65535, 5}, 12));
  EXPECT_EQ((Bytes{0x7F, 0xF8, 0x00}), Packed<int16_t>({32767, -32768}, 12));
  EXPECT_EQ((Bytes{0x80}), Packed<uint8_t>({200}, 1));
}

TEST(Pack, FillsTheLastByteWithZeros) {
  EXPECT_EQ((Bytes{0xFF, 0x80}), Packed<uint8_t>({7, 7, 7}, 3));
}

TEST(Pack, KeepsThreeByteSamplesInTheMachinesOrder) {
  const uint32_t value = 0x00010203;
  Bytes expected(3);
  std::memcpy(expected.data(),
              reinterpret_cast<const uint8_t*>(&value) +
                  (reinterpret_cast<const uint8_t&>(value) == 0 ? 1 : 0),
              3);
  EXPECT_EQ(expected, Packed<uint32_t>({value}, 24));
  EXPECT_EQ(std::vector<uint32_t>{value}, Unpacked<uint32_t>(expected, 24, 1));
}

template <class T>
void ExpectRoundTrip(uint32_t bits, std::mt19937& random) {
  std::vector<T> samples(random() % 70);
  const int64_t values = int64_t{1} << bits;
  for (T& sample : samples)
    sample = static_cast<T>(int64_t(random() % uint64_t(values)) -
                            (std::is_signed_v<T> ? values / 2 : 0));
  const Bytes packed = Packed(samples, bits);
  EXPECT_EQ(samples, Unpacked<T>(packed, bits, samples.size())) << bits << " bits";
}

TEST(PackAndUnpack, GiveBackWhatTheBitsCanHold) {
  std::mt19937 random(7);
  for (int round = 0; round < 20; ++round)
    for (uint32_t bits = 1; bits < 32; ++bits) {
      if (bits <= 8) ExpectRoundTrip<uint8_t>(bits, random), ExpectRoundTrip<int8_t>(bits, random);
      if (bits <= 16)
        ExpectRoundTrip<uint16_t>(bits, random), ExpectRoundTrip<int16_t>(bits, random);
      ExpectRoundTrip<uint32_t>(bits, random), ExpectRoundTrip<int32_t>(bits, random);
    }
}

}  // namespace
}  // namespace orin::drivers
