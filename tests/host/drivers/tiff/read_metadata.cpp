/// The metadata tag's text: what is understood, what is written, and what does no harm.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "host/drivers/tiff/gdalmetadata.h"

namespace orin::drivers {
namespace {

using Items = std::vector<MetadataItem>;

TEST(Metadata, OfAFileIsReadWithItsAttributes) {
  const Items items = ParseMetadata(R"(<GDALMetadata>
  <Item name="AREA_OR_POINT">Area</Item>
  <Item name='SCALE' sample='2' role="scale">0.5</Item>
  <Item sample="0" name="KIND" domain="IMAGE" extra="x" />
</GDALMetadata>)");
  EXPECT_EQ((Items{{"AREA_OR_POINT", std::nullopt, "", "", "Area"},
                   {"SCALE", 2, "scale", "", "0.5"},
                   {"KIND", 0, "", "IMAGE", ""}}),
            items);
}

TEST(Metadata, ReferencesStandForCharacters) {
  const Items items = ParseMetadata(
      "<Item name=\"a&quot;&apos;b\">1 &lt; 2 &amp;&amp; 3 &gt; 2 &#65;&#x20AC; &unknown; & "
      "&#0;</Item>");
  ASSERT_EQ(1u, items.size());
  EXPECT_EQ("a\"'b", items[0].name);
  EXPECT_EQ("1 < 2 && 3 > 2 A\xE2\x82\xAC &unknown; & &#0;", items[0].text);
}

TEST(Metadata, CommentsAndCharacterDataAreTold) {
  const Items items = ParseMetadata(
      "<!-- <Item name=\"no\">no</Item> --><Item name=\"yes\">a<!-- b -->c<![CDATA[<&>]]></Item>");
  EXPECT_EQ((Items{{"yes", std::nullopt, "", "", "ac<&>"}}), items);
}

TEST(Metadata, AnItemThatNeverEndsIsPassedOver) {
  EXPECT_EQ(Items{}, ParseMetadata("<Item name=\"a\">text"));
  EXPECT_EQ(Items{}, ParseMetadata("<Item name=\"a"));
  EXPECT_EQ(Items{}, ParseMetadata("<Item"));
  EXPECT_EQ(Items{}, ParseMetadata("<Items name=\"a\">text</Items>"));
  EXPECT_EQ((Items{{"b", std::nullopt, "", "", "2"}}),
            ParseMetadata("<Item name=\"a\">1<Item name=\"b\">2</Item>"));
  EXPECT_EQ((Items{{"b", std::nullopt, "", "", "2"}}),
            ParseMetadata("<Item name=a>1</Item><Item sample=\"-1\" name=\"b\">2</Item>"));
}

TEST(Metadata, OfAnyTextIsReadBackAsItWasComposed) {
  std::mt19937 random(11);
  const auto text = [&random](size_t longest) {
    std::string made;
    for (size_t i = random() % (longest + 1); i > 0; --i)
      made += random() % 3 ? "<>&\"'; ]"[random() % 8] : static_cast<char>(1 + random() % 255);
    return made;
  };
  for (int round = 0; round < 500; ++round) {
    Items items;
    for (size_t i = random() % 4; i > 0; --i)
      items.push_back({"n" + text(6),
                       random() % 2 ? std::optional<unsigned>(random()) : std::nullopt, text(4),
                       text(4), text(30)});
    EXPECT_EQ(items, ParseMetadata(ComposeMetadata(items)));
  }
}

TEST(Metadata, GarbageNeverYieldsMoreThanItHolds) {
  std::mt19937 random(13);
  const char* pieces[] = {"<Item", " name=\"", "\"",   ">",         "</Item>",
                          "/>",    "<!--",     "-->",  "<![CDATA[", "]]>",
                          "&#",    ";",        "&amp", " ",         "sample='4294967296'",
                          "x"};
  size_t found = 0;
  for (int round = 0; round < 3000; ++round) {
    std::string garbage;
    for (size_t i = random() % 30; i > 0; --i) garbage += pieces[random() % std::size(pieces)];
    size_t length = 0;
    for (const MetadataItem& item : ParseMetadata(garbage)) {
      ++found;
      EXPECT_FALSE(item.name.empty());
      length += item.name.size() + item.text.size();
    }
    EXPECT_LE(length, garbage.size());
  }
  EXPECT_GT(found, 0u);
}

}  // namespace
}  // namespace orin::drivers
