// SPDX-License-Identifier: MIT
#include "host/datasources/leveloptions.h"

#include <gtest/gtest.h>

namespace orin::datasources {
namespace {

/// What is wrong with the last of `texts`; the ones before are right.
std::string ProblemOf(std::initializer_list<const char*> texts, LevelOptions& options) {
  std::string problem;
  for (const char* text : texts) {
    EXPECT_EQ("", problem);
    problem = ReadLevelOption(text, options);
  }
  return problem;
}
std::string ProblemOf(const char* text) {
  LevelOptions options;
  return ProblemOf({text}, options);
}

TEST(LevelOptions, SayNothingAtFirst) {
  EXPECT_FALSE(LevelOptions().SayCoding());
  EXPECT_EQ(BigTiff::kIfNeeded, LevelOptions().bigTiff);
}

TEST(LevelOptions, AreReadInAnyCase) {
  LevelOptions options;
  EXPECT_EQ("", ProblemOf({"compress=zStd", "Predictor=standard", "TILE=512x256", "level=19",
                           "QUALITY=100", "bigtiff=if_safer"},
                          options));
  EXPECT_EQ(LevelCompression::kZstd, options.compression);
  EXPECT_EQ(LevelPredictor::kHorizontal, options.predictor);
  EXPECT_EQ(512u, options.tileWidth);
  EXPECT_EQ(256u, options.tileHeight);
  EXPECT_EQ(19, options.effort);
  EXPECT_EQ(100, options.quality);
  EXPECT_EQ(BigTiff::kIfSafer, options.bigTiff);
  EXPECT_TRUE(options.SayCoding());
}

TEST(LevelOptions, LaterOneReplacesAnEarlierOne) {
  LevelOptions options;
  EXPECT_EQ("", ProblemOf({"COMPRESS=LZW", "COMPRESS=NONE", "TILE=128", "TILE=64"}, options));
  EXPECT_EQ(LevelCompression::kNone, options.compression);
  EXPECT_EQ(64u, options.tileHeight);
}

TEST(LevelOptions, PredictorHasNumbersAndNames) {
  for (const auto& [text, value] : {std::pair{"PREDICTOR=1", LevelPredictor::kNone},
                                    {"PREDICTOR=NO", LevelPredictor::kNone},
                                    {"PREDICTOR=2", LevelPredictor::kHorizontal},
                                    {"PREDICTOR=3", LevelPredictor::kFloatingPoint},
                                    {"PREDICTOR=FLOAT", LevelPredictor::kFloatingPoint}}) {
    LevelOptions options;
    EXPECT_EQ("", ProblemOf({text}, options));
    EXPECT_EQ(value, options.predictor) << text;
  }
}

TEST(LevelOptions, AWrongValueIsAnsweredWithTheRightOnes) {
  EXPECT_EQ(
      "COMPRESS is one of NONE, DEFLATE, LZW, ZSTD, PACKBITS, LZMA, LERC, JPEG, WEBP, not "
      "\"GZIP\"",
      ProblemOf("COMPRESS=gzip"));
  EXPECT_EQ("BIGTIFF is one of YES, NO, IF_NEEDED, IF_SAFER, not \"\"", ProblemOf("BIGTIFF="));
  EXPECT_EQ("QUALITY is a number from 1 to 100, not \"101\"", ProblemOf("QUALITY=101"));
  EXPECT_EQ("LEVEL is a number from 1 to 22, not \"0\"", ProblemOf("LEVEL=0"));
  for (const char* text : {"TILE=0", "TILE=100", "TILE=64x", "TILE=64x17", "TILE=x64", "TILE=-16",
                           "TILE=16400", "TILE=64x64x64"})
    EXPECT_NE("", ProblemOf(text)) << text;
}

TEST(LevelOptions, AnUnknownKeyIsAnsweredWithTheKeysThereAre) {
  for (const char* text : {"BLOCKSIZE=64", "COMPRESS", "", "=", "=ZSTD"}) {
    const std::string problem = ProblemOf(text);
    for (const char* key : {"COMPRESS=", "PREDICTOR=", "TILE=", "LEVEL=", "QUALITY=", "BIGTIFF="})
      EXPECT_NE(std::string::npos, problem.find(key)) << text;
  }
}

TEST(LevelOptions, ContradictionsAreFoundWithoutAnImage) {
  const auto contradictionIn = [](std::initializer_list<const char*> texts) {
    LevelOptions options;
    EXPECT_EQ("", ProblemOf(texts, options));
    return ContradictionIn(options);
  };
  EXPECT_NE("", contradictionIn({"COMPRESS=LZW", "LEVEL=6"}));
  EXPECT_NE("", contradictionIn({"COMPRESS=DEFLATE", "LEVEL=13"}));
  EXPECT_NE("", contradictionIn({"COMPRESS=ZSTD", "QUALITY=50"}));
  EXPECT_NE("", contradictionIn({"COMPRESS=JPEG", "PREDICTOR=2"}));
  EXPECT_EQ("", contradictionIn({"COMPRESS=DEFLATE", "LEVEL=12", "PREDICTOR=2"}));
  EXPECT_EQ("", contradictionIn({"COMPRESS=ZSTD", "LEVEL=22"}));
  EXPECT_EQ("", contradictionIn({"COMPRESS=WEBP", "QUALITY=50", "PREDICTOR=NO"}));
  EXPECT_EQ("", contradictionIn({"LEVEL=22", "QUALITY=5", "PREDICTOR=3"}));  // the image decides
}

}  // namespace
}  // namespace orin::datasources
