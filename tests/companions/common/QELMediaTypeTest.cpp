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

TEST(QELMediaTypeTest, TellsWhatIsNoMediaType) {
  for (const char* type :
       {"audio/mpeg", "x/y", "audio/ogg; codecs=opus", "audio/mpeg ", "application/epub+zip"}) {
    EXPECT_TRUE(QELIsMediaType(type)) << type;
  }
  for (const char* type : {"", "mp3", "/", "/mpeg", "audio/", "audio//mpeg", "audio/ mpeg",
                           "audio /mpeg", " audio/mpeg", "audio/\t", "audio/\r", "audio/\n"}) {
    EXPECT_FALSE(QELIsMediaType(type)) << type;
  }
}

}  // namespace
