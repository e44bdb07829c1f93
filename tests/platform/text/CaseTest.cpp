#include "platform/text/Case.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <memory>
#include <string>
#include <string_view>

namespace {

TEST(CaseTest, MapsByUnicode) {
  const struct {
    std::string_view text, lower, upper;
  } rows[] = {
      {"", "", ""},
      {"MP3", "mp3", "MP3"},
      {"@AZ[`az{ 09", "@az[`az{ 09", "@AZ[`AZ{ 09"},
      {"Äpfel", "äpfel", "ÄPFEL"},
      {"straße", "straße", "STRASSE"},
      {"ΟΔΟΣ ΟΔΟΣ", "οδος οδος", "ΟΔΟΣ ΟΔΟΣ"},
      {"Ж€😀", "ж€😀", "Ж€😀"},
      {"ﬁ", "ﬁ", "FI"},
      // The Turkish mapping of I belongs to a locale, not to this function.
      {"Iı", "iı", "II"},
      {"İ", "i̇", "İ"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(platform::lowercased(row.text), row.lower) << row.text;
    EXPECT_EQ(platform::uppercased(row.text), row.upper) << row.text;
  }
}

TEST(CaseTest, FoldsWhatDiffersInCaseAlone) {
  EXPECT_EQ(platform::caseFolded("Show.MP3"), "show.mp3");
  EXPECT_EQ(platform::caseFolded("Straße"), platform::caseFolded("STRASSE"));
  EXPECT_EQ(platform::caseFolded("ΟΔΟΣ"), platform::caseFolded("οδος"));
  EXPECT_EQ(platform::caseFolded("K"), "k");  // the Kelvin sign
  EXPECT_EQ(platform::caseFolded("A\xFF"), "a\xFF");
}

TEST(CaseTest, KeepsNUL) {
  EXPECT_EQ(platform::lowercased(std::string_view("A\0B", 3)), std::string_view("a\0b", 3));
  EXPECT_EQ(platform::uppercased(std::string_view("ä\0b", 4)), std::string_view("Ä\0B", 4));
}

// ICU counts in 32 bits. A character that is mapped stands across the end of the first piece.
TEST(CaseTest, MapsTextsLongerThanICUTakes) {
  constexpr std::size_t kPieceLimit = std::numeric_limits<std::int32_t>::max() / 4;
  constexpr std::size_t kSize = kPieceLimit + 3;
  constexpr std::string_view kAcross = "B\u00C9A";
  // Zeros that nothing but these characters is written into need no memory.
  const std::unique_ptr<char, void (*)(void*)> zeros(static_cast<char*>(std::calloc(kSize, 1)),
                                                     &std::free);
  ASSERT_TRUE(zeros);
  kAcross.copy(zeros.get() + kPieceLimit - 2, kAcross.size());
  const std::string lower = platform::lowercased({zeros.get(), kSize});
  EXPECT_EQ(lower.size(), kSize);
  EXPECT_EQ(lower.find_first_not_of('\0'), kPieceLimit - 2);
  EXPECT_EQ(std::string_view(lower).substr(kPieceLimit - 2), std::string_view("b\u00E9a\0", 5));
}

TEST(CaseTest, KeepsMalformedSequences) {
  const std::string_view malformed[] = {"\xFF", "\xC3", "\x80", "\xE2\x82", "\xF0\x9F\x98"};
  for (const std::string_view sequence : malformed) {
    const std::string text = std::string("A").append(sequence).append("B");
    EXPECT_EQ(platform::lowercased(text), std::string("a").append(sequence).append("b"));
    EXPECT_EQ(platform::uppercased(sequence), sequence);
  }
}

}  // namespace
