#include "platform/files/FileKind.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

using namespace std::string_view_literals;

TEST(FileKindTest, FirstBytesTellTheKind) {
  EXPECT_EQ(kindOfBytes("ID3"), "an MP3 file");
  EXPECT_EQ(kindOfBytes("\0\0\0\x20"
                        "ftyp"sv),
            "an MP4 file");
  EXPECT_EQ(kindOfBytes("RIFF\0\0\0\0WAVE"sv), "a WAVE file");
  EXPECT_EQ(kindOfBytes("RIFF\0\0\0\0WEBP"sv), "a WebP picture");
  EXPECT_EQ(kindOfBytes("\xFF\xFB"), "an MPEG audio file");
  EXPECT_EQ(kindOfBytes("\xFF\xF9"), "an AAC file");
  EXPECT_EQ(kindOfBytes("\xFF\xD8\xFF"), "a JPEG picture");
  EXPECT_EQ(kindOfBytes("\xEF\xBB\xBF\r\n <HTML>"), kHTMLPage);
  EXPECT_EQ(kindOfBytes("\xEF\xBB\xBF<head>"), kHTMLPage);
  for (const std::string_view head : {"", "\xFF", "\xFF\xE9", "\xFF\xE0", "\xFF\x7B", "\xFF\xBB",
                                      "\xFF\xDB", "\xFE\xFB", "RIFF", "<htm", "text"}) {
    EXPECT_EQ(kindOfBytes(head), std::nullopt) << head;
  }
}

TEST(FileKindTest, ExtensionsBelongToKinds) {
  EXPECT_TRUE(isExtensionOfKind("MP3", "an MP3 file"));
  EXPECT_TRUE(isExtensionOfKind("mp3", "an MPEG audio file"));
  EXPECT_TRUE(isExtensionOfKind("m4b", "an MP4 file"));
  EXPECT_TRUE(isExtensionOfKind("html", kHTMLPage));
  EXPECT_FALSE(isExtensionOfKind("mp3", "an MP4 file"));
  EXPECT_TRUE(isExtensionOfKind("xyz", "an MP4 file"));
  EXPECT_FALSE(isExtensionOfKind("xyz", kHTMLPage));
}

}  // namespace
}  // namespace platform
