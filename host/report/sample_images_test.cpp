#include "host/report/sample_images.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(IsSamples, IsAListOfNumbersOfAnyKind) {
  EXPECT_TRUE(isSamples(Array{1}));
  EXPECT_TRUE(isSamples(Array{-1, 2U, 0.5, 36.6F, true}));
  EXPECT_FALSE(isSamples(Array{}));
  EXPECT_FALSE(isSamples(Array{1, "2"}));
  EXPECT_FALSE(isSamples(Array{Value(Array{1})}));
  EXPECT_FALSE(isSamples(1));
}

TEST(IsImage, IsADictionaryWithSamples) {
  EXPECT_TRUE(isImage(Dictionary{{"name", "x"}, {"samples", Array{1}}}));
  EXPECT_FALSE(isImage(Dictionary{{"name", "x"}, {"samples", Array{}}}));
  EXPECT_FALSE(isImage(Dictionary{}));
  EXPECT_FALSE(isImage(Array{1}));
}

TEST(ImagesIn, AreTheValueItselfOrAllElementsOfAList) {
  const Value image(Dictionary{{"samples", Array{1}}});
  const Value other(Dictionary{{"samples", Array{1, 2}}, {"number", 7}});
  const Value plain(Dictionary{{"number", 7}});
  EXPECT_EQ(imagesIn(image), std::vector<const Dictionary*>{image.dictionary()});
  const Value list(Array{image, other});
  const std::vector<const Dictionary*> images = imagesIn(list);
  ASSERT_EQ(images.size(), 2U);
  EXPECT_EQ(images[0], image.dictionary());
  EXPECT_EQ(images[1], other.dictionary());
  EXPECT_TRUE(imagesIn(Array{image, plain}).empty());
  EXPECT_TRUE(imagesIn(Array{image, 3}).empty());
  EXPECT_TRUE(imagesIn(Array{}).empty());
  EXPECT_TRUE(imagesIn(plain).empty());
  EXPECT_TRUE(imagesIn(3).empty());
}

}  // namespace
}  // namespace quazor
