#include "companions/common/QELMediaType.h"

#include <gtest/gtest.h>

namespace {

TEST(QELMediaTypeTest, ExtensionsTellTypes) {
  EXPECT_EQ(QELMediaTypeOfExtension("mp3"), "audio/mpeg");
  EXPECT_EQ(QELMediaTypeOfExtension("M4A"), "audio/mp4");
  EXPECT_EQ(QELMediaTypeOfExtension("mp4"), "video/mp4");
  EXPECT_EQ(QELMediaTypeOfExtension("Jpeg"), "image/jpeg");
  EXPECT_EQ(QELMediaTypeOfExtension("pdf"), "application/pdf");
  for (const char* extension : {"", "mp", "mp33", "plist", ".mp3", "php"}) {
    EXPECT_EQ(QELMediaTypeOfExtension(extension), std::nullopt) << extension;
  }
}

TEST(QELMediaTypeTest, ATypeHasTwoPartsWithoutWhiteSpace) {
  for (const char* type :
       {"audio/mpeg", "a/b", "audio/x-m4a", "audio/mpeg; codecs=mp3", "audio/mpeg "}) {
    EXPECT_TRUE(QELIsMediaType(type)) << type;
  }
  for (const char* text :
       {"", "audio", "/", "audio/", "/mpeg", "audio//mpeg", "audio/ mpeg", "audio/\tmpeg",
        "audio/\rmpeg", "audio/\nmpeg", " audio/mpeg", "audio /mpeg"}) {
    EXPECT_FALSE(QELIsMediaType(text)) << text;
  }
}

}  // namespace
