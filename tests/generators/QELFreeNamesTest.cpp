#include "generators/QELFreeNames.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

TEST(QELFreeNamesTest, NamesAreFreeWhateverTheirCase) {
  QELFreeNames names;
  names.take("Show.MP3");
  names.take("straße.mp3");
  names.take("show-3.mp3");
  EXPECT_EQ(names.reserve("show", "mp3"), "show-2.mp3");
  EXPECT_EQ(names.reserve("SHOW", "mp3"), "SHOW-4.mp3");
  EXPECT_EQ(names.reserve("show", "ogg"), "show.ogg");
  EXPECT_EQ(names.reserve("STRASSE", "mp3"), "STRASSE-2.mp3");
  EXPECT_EQ(names.reserve("show-2", "mp3"), "show-2-2.mp3");
}

struct Row {
  std::string base;
  std::string extension;
  std::string name;
};

TEST(QELFreeNamesTest, NamesAreThoseOfEveryFileSystem) {
  const std::vector<Row> rows = {
      {"", "", "episode"},
      {"", "mp3", "episode.mp3"},
      {"play", "", "play"},
      {"a:b/c\\d*e?f\"g<h>i|j", "m/4", "a_b_c_d_e_f_g_h_i_j.m_4"},
      {std::string("a\0b\x7F\n", 5), "mp3", "a_b__.mp3"},
      {"\xFFz", "mp3", "_z.mp3"},
      {"a\uFFFE", "mp3", "a_.mp3"},
      {"..", "", "episode"},
      {".hidden", "mp3", "hidden.mp3"},
      {" a . ", "mp3 .", "a.mp3"},
      {"CON", "mp3", "_CON.mp3"},
      {"con.tar", "mp3", "_con.tar.mp3"},
      {"lpt1", "mp3", "_lpt1.mp3"},
      {"Com0", "mp3", "_Com0.mp3"},
      {"lptx", "mp3", "lptx.mp3"},
      {"comx", "mp3", "comx.mp3"},
      {"com10", "mp3", "com10.mp3"},
      {"com", "mp3", "com.mp3"},
      {"console", "mp3", "console.mp3"},
      {"Gänse", "mp3", "Gänse.mp3"},
      {std::string(300, 'a'), "mp3", std::string(251, 'a') + ".mp3"},
      {std::string(200, 'a') + std::string(100, ':'), std::string(300, 'x'),
       std::string(200, 'a') + std::string(22, '_') + "." + std::string(32, 'x')},
  };
  for (const Row& row : rows) {
    EXPECT_EQ(QELFreeNames().reserve(row.base, row.extension), row.name) << row.base;
  }
}

TEST(QELFreeNamesTest, ALongNameIsCutBetweenCharacters) {
  std::string base = "a";
  for (int count = 0; count < 200; ++count) base += "ä";
  std::string cut = "a";
  for (int count = 0; count < 125; ++count) cut += "ä";
  QELFreeNames names;
  EXPECT_EQ(names.reserve(base, "mp3"), cut + ".mp3");  // 251 bytes for the base, an odd number
  cut.resize(cut.size() - 2);
  EXPECT_EQ(names.reserve(base, "mp3"), cut + "-2.mp3");
}

TEST(QELFreeNamesTest, ACharacterThatIsCutGoesAsAWhole) {
  const auto repeated = [](std::string_view character, int count) {
    std::string text;
    for (int i = 0; i < count; ++i) text += character;
    return text;
  };
  const struct {
    std::string_view character;
    int mostTimes;  // in 255 bytes, and in the 251 before an extension
    int mostTimesInExtension;
  } rows[] = {{"ä", 125, 16}, {"日", 83, 10}, {"😀", 62, 8}};
  for (const auto& [character, mostTimes, mostTimesInExtension] : rows) {
    EXPECT_EQ(QELFreeNames().reserve(repeated(character, 300), "mp3"),
              repeated(character, mostTimes) + ".mp3");
    EXPECT_EQ(QELFreeNames().reserve("a", repeated(character, 300)),
              "a." + repeated(character, mostTimesInExtension));
  }
}

}  // namespace
