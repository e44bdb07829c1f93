#include "model/QELEpisodeMatching.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using Identities = std::vector<QELEpisodeIdentity>;
using Matches = std::vector<std::optional<std::size_t>>;
using platform::OptionalText;

constexpr auto kNone = std::nullopt;

QELEpisodeIdentity identity(OptionalText uuid, OptionalText origin, OptionalText title,
                            std::optional<int> date) {
  std::optional<std::chrono::seconds> seconds;
  if (date) seconds = std::chrono::seconds(*date);
  return {std::move(uuid), std::move(origin), std::move(title), seconds};
}

struct Pair {
  const char* why;
  QELEpisodeIdentity source;
  QELEpisodeIdentity kept;
  bool isSame;
};

TEST(QELEpisodeMatchingTest, OneIsKnownByItsSigns) {
  const std::vector<Pair> pairs = {
      {"uuid", identity("u", "a", "A", 1), identity("u", "b", "B", 2), true},
      {"uuids that differ", identity("u", "a", "A", 1), identity("v", "a", "A", 1), false},
      {"one uuid alone, origin", identity("u", "a", "A", 1), identity(kNone, "a", "A", 1), true},
      {"one uuid alone, title and date", identity(kNone, "a", "A", 1), identity("u", "b", "A", 1),
       true},
      {"origin, title changed", identity(kNone, "a", "B", 1), identity(kNone, "a", "A", 1), true},
      {"origin, date changed", identity(kNone, "a", "A", 2), identity(kNone, "a", "A", 1), true},
      {"origin, both changed", identity(kNone, "a", "B", 2), identity(kNone, "a", "A", 1), false},
      {"origin, title changed, no dates", identity(kNone, "a", "B", kNone),
       identity(kNone, "a", "A", kNone), true},
      {"origin, date came, title changed", identity(kNone, "a", "B", 1),
       identity(kNone, "a", "A", kNone), false},
      {"origin, title went, no dates", identity(kNone, "a", kNone, kNone),
       identity(kNone, "a", "A", kNone), true},
      {"title and date", identity(kNone, "b", "A", 1), identity(kNone, "a", "A", 1), true},
      {"title and date, no origin", identity(kNone, "b", "A", 1), identity(kNone, kNone, "A", 1),
       true},
      {"title alone", identity(kNone, "b", "A", kNone), identity(kNone, "a", "A", kNone), false},
      {"date alone", identity(kNone, "b", kNone, 1), identity(kNone, "a", kNone, 1), false},
      {"nothing at all", identity(kNone, kNone, kNone, kNone), identity(kNone, kNone, kNone, kNone),
       false},
      {"no origins, title", identity(kNone, kNone, "A", kNone), identity(kNone, kNone, "A", kNone),
       false},
      {"what no reference file holds", identity(kNone, "/\xE9/1.mp3", "A", kNone),
       identity(kNone, "//1.mp3", "B", kNone), true},
      {"uuid, with what no reference file holds", identity("u\x01", "a", "A", 1),
       identity("u", "b", "B", 2), true},
      {"texts that run together", identity(kNone, "a", "bA", 1), identity(kNone, "ab", "A", 1),
       false},
  };
  for (const Pair& pair : pairs) {
    const Matches expected = {pair.isSame ? std::optional<std::size_t>(0) : std::nullopt};
    EXPECT_EQ(QELMatchedEpisodes(Identities{pair.source}, Identities{pair.kept}), expected)
        << pair.why;
  }
}

TEST(QELEpisodeMatchingTest, EachKeptOneIsTakenOnce) {
  const Identities source = {identity("u", "a", "A", 1), identity("u", "b", "B", 2)};
  EXPECT_EQ(QELMatchedEpisodes(source, Identities{identity("u", kNone, kNone, kNone)}),
            (Matches{0, kNone}));
  EXPECT_EQ(QELMatchedEpisodes(source,
                               Identities{identity("u", "b", "B", 2), identity("u", "a", "A", 1)}),
            (Matches{1, 0}));
}

TEST(QELEpisodeMatchingTest, TheSurerSignTakesIt) {
  // The first would take the only kept one by its origin, if the second were not the very one.
  const Identities source = {identity(kNone, "latest", "Week 1", 2),
                             identity(kNone, "latest", "Week 1", 1)};
  EXPECT_EQ(QELMatchedEpisodes(source, Identities{identity(kNone, "latest", "Week 1", 1)}),
            (Matches{kNone, 0}));
}

TEST(QELEpisodeMatchingTest, WhoHasAUUIDTakesNoneWithAnother) {
  const Identities kept = {identity("v", "a", "A", 1), identity(kNone, "a", "A", 1)};
  EXPECT_EQ(QELMatchedEpisodes(Identities{identity("u", "a", "A", 1)}, kept), (Matches{1}));
  EXPECT_EQ(QELMatchedEpisodes(Identities{identity(kNone, "a", "A", 1)}, Identities{kept[0]}),
            (Matches{0}));
}

TEST(QELEpisodeMatchingTest, OfOneUUIDTheOriginTells) {
  const Identities kept = {identity("u", "a", "A", 1), identity("u", "b", "B", 2)};
  const Identities source = {identity("u", "c", "C", 3), identity("U", "b", "B", 2)};
  EXPECT_EQ(QELMatchedEpisodes(source, kept), (Matches{0, 1}));
  EXPECT_EQ(QELMatchedEpisodes(Identities{source[1], source[0]}, kept), (Matches{1, 0}));
}

TEST(QELEpisodeMatchingTest, ABlankUUIDIsNone) {
  for (const char* blank : {"", " \n"}) {
    const auto episode = QELEpisode::episode();
    episode->setUuid(platform::Text(blank));
    EXPECT_EQ(QELIdentityOf(*episode).uuid, kNone);
    EXPECT_EQ(QELIdentityOf(platform::Dictionary{{"EpisodeUUID", blank}}).uuid, kNone);
  }
}

TEST(QELEpisodeMatchingTest, TheUUIDAndTheOriginDoNotRunTogether) {
  const Identities kept = {identity("u", "x1:y", "A", 1), identity("u4:x", "y", "B", 2)};
  EXPECT_EQ(QELMatchedEpisodes(Identities{identity("u4:x", "y", "C", 3)}, kept), (Matches{1}));
  EXPECT_EQ(QELMatchedEpisodes(Identities{identity("u", "x1:y", "C", 3)}, kept), (Matches{0}));
}

TEST(QELEpisodeMatchingTest, FractionsOfSecondsDoNotCount) {
  const auto episode = QELEpisode::episode();
  episode->setDate(platform::PointInTime(std::chrono::milliseconds(1999)));
  EXPECT_EQ(QELIdentityOf(*episode).date, std::chrono::seconds(1));
  episode->setDate(platform::PointInTime(std::chrono::milliseconds(-1)));
  EXPECT_EQ(QELIdentityOf(*episode).date, std::chrono::seconds(-1));
}

TEST(QELEpisodeMatchingTest, AnEntryIsKnownByItsOriginNotItsReference) {
  const platform::Dictionary entry{{"EpisodeDate", platform::PointInTime(std::chrono::seconds(7))},
                                   {"EpisodeName", "A"},
                                   {"EpisodeOrigin", "https://a.example/1.mp3"},
                                   {"EpisodeReference", "1.mp3"},
                                   {"EpisodeUUID", "u"}};
  const QELEpisodeIdentity identity = QELIdentityOf(entry);
  EXPECT_EQ(identity.uuid, OptionalText("u"));
  EXPECT_EQ(identity.origin, OptionalText("https://a.example/1.mp3"));
  EXPECT_EQ(identity.title, OptionalText("A"));
  EXPECT_EQ(identity.date, std::chrono::seconds(7));
  EXPECT_EQ(QELIdentityOf(platform::Dictionary{{"EpisodeDate", "7"}}).date, std::nullopt);
}

TEST(QELEpisodeMatchingTest, TwentyThousandOfOneOriginCostNoMoreThanOthers) {
  Identities kept;
  Identities source;
  Matches expected;
  constexpr int kCount = 20000;
  for (int number = 0; number < kCount; ++number) {
    // Those with a uuid come first, and none of the source's may take them.
    kept.push_back(identity("kept " + std::to_string(number), "latest", "same", number));
    source.push_back(identity("new " + std::to_string(number), "latest", "same", number));
    expected.push_back(kNone);
  }
  for (std::size_t number = 0; number < kCount; ++number) {
    kept.push_back(identity(kNone, "latest", "same", 0));
    expected[number] = number + kCount;
  }
  EXPECT_EQ(QELMatchedEpisodes(source, kept), expected);
}

}  // namespace
