#include "model/QELEpisode.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <string>
#include <thread>

namespace {

using namespace std::chrono_literals;
using platform::Dictionary;
using platform::OptionalText;
using platform::PointInTime;
using platform::PropertyListValue;
using platform::Text;

using TextGetter = OptionalText (QELEpisode::*)() const;
using TextSetter = void (QELEpisode::*)(OptionalText);

struct TextField {
  const char* referenceKey;
  const char* feedKey;  // null for what no feed item holds
  TextGetter get;
  TextSetter set;
};

constexpr TextField kTextFields[] = {
    {"EpisodeUUID", "QELUUID", &QELEpisode::uuid, &QELEpisode::setUuid},
    {"EpisodeName", "title", &QELEpisode::title, &QELEpisode::setTitle},
    {"EpisodeAuthor", "author", &QELEpisode::author, &QELEpisode::setAuthor},
    {"EpisodeKeywords", "keywords", &QELEpisode::keywords, &QELEpisode::setKeywords},
    {"EpisodeDescription", "description", &QELEpisode::episodeDescription,
     &QELEpisode::setEpisodeDescription},
    {"EpisodeCategory", "category", &QELEpisode::category, &QELEpisode::setCategory},
    {"EpisodeAdvisoryLabel", "advisoryLabel", &QELEpisode::advisoryLabel,
     &QELEpisode::setAdvisoryLabel},
    {"EpisodeType", "contentType", &QELEpisode::contentType, &QELEpisode::setContentType},
    {"EpisodeReference", "url", &QELEpisode::location, &QELEpisode::setLocation},
    {"EpisodeReferenceType", nullptr, &QELEpisode::referenceType, &QELEpisode::setReferenceType},
    {"EpisodePosterReference", "poster", &QELEpisode::posterLocation,
     &QELEpisode::setPosterLocation},
    {"EpisodePosterReferenceType", nullptr, &QELEpisode::posterReferenceType,
     &QELEpisode::setPosterReferenceType},
};

const PointInTime kDate{1181079000s};  // 2007-06-05 21:30:00 UTC

/// Every field set, to a value of its own.
std::shared_ptr<QELEpisode> fullEpisode() {
  auto episode = QELEpisode::episode();
  for (const TextField& field : kTextFields) {
    (episode.get()->*field.set)(Text(std::string("value of ") + field.referenceKey));
  }
  episode->setDate(kDate);
  episode->setOrvaneOrder(7);
  episode->setContentLength(18446744073709551615U);
  return episode;
}

void expectAbsent(const QELEpisode& episode) {
  for (const TextField& field : kTextFields) {
    EXPECT_EQ((episode.*field.get)(), std::nullopt) << field.referenceKey;
  }
  EXPECT_EQ(episode.date(), std::nullopt);
  EXPECT_EQ(episode.contentLength(), 0U);
}

TEST(QELEpisodeTest, NewEpisodeHasOrderZeroAndNothingElse) {
  const auto episode = QELEpisode::episode();
  expectAbsent(*episode);
  EXPECT_EQ(episode->orvaneOrder(), 0);
  EXPECT_EQ(episode->dictionary(), (Dictionary{{"EpisodeOrder", std::int64_t{0}}}));
}

TEST(QELEpisodeTest, MissingOrEmptyDictionaryGivesAnEmptyRecordWithoutOrder) {
  const Dictionary empty;
  for (const Dictionary* dictionary : {static_cast<const Dictionary*>(nullptr), &empty}) {
    for (const auto& episode : {QELEpisode::episodeWithDictionary(dictionary),
                                QELEpisode::episodeWithFeedDictionary(dictionary)}) {
      expectAbsent(*episode);
      EXPECT_EQ(episode->orvaneOrder(), -1);
      EXPECT_EQ(episode->dictionary(), Dictionary());
    }
  }
}

TEST(QELEpisodeTest, EpisodeOfNothingIsSmall) {
  EXPECT_LE(sizeof(QELEpisode), 88U);  // a feed may have one for every seven bytes
}

TEST(QELEpisodeTest, EachKeyFillsItsField) {
  for (const TextField& field : kTextFields) {
    const Dictionary reference{{field.referenceKey, "x"}};
    EXPECT_EQ((*QELEpisode::episodeWithDictionary(&reference).*field.get)(), "x")
        << field.referenceKey;
    if (!field.feedKey) continue;
    const Dictionary item{{field.feedKey, "x"}};
    EXPECT_EQ((*QELEpisode::episodeWithFeedDictionary(&item).*field.get)(), "x") << field.feedKey;
  }
  for (const Dictionary& item : {Dictionary{{"date", kDate}}, Dictionary{{"", "x"}}}) {
    EXPECT_EQ(QELEpisode::episodeWithFeedDictionary(&item)->date().has_value(),
              platform::valueForKey(item, "date") != nullptr);
    EXPECT_EQ(QELEpisode::episodeWithFeedDictionary(&item)->referenceType(), std::nullopt);
  }
}

TEST(QELEpisodeTest, FeedItemsIgnoreKeysOfReferenceFiles) {
  const Dictionary dictionary{{"EpisodeName", "x"},
                              {"referenceType", "local"},
                              {"url", "http://a.example/1.mp3"},
                              {"EpisodeReferenceType", "local"}};
  const auto episode = QELEpisode::episodeWithFeedDictionary(&dictionary);
  EXPECT_EQ(episode->title(), std::nullopt);
  EXPECT_EQ(episode->referenceType(), "remote");
}

TEST(QELEpisodeTest, DictionaryHoldsEveryFieldAndReadsBack) {
  const auto episode = fullEpisode();
  const Dictionary dictionary = episode->dictionary();
  EXPECT_EQ(dictionary.size(), std::size(kTextFields) + 3);
  for (const TextField& field : kTextFields) {
    EXPECT_EQ(*platform::valueForKey(dictionary, field.referenceKey),
              PropertyListValue(std::string("value of ") + field.referenceKey));
  }
  EXPECT_EQ(*platform::valueForKey(dictionary, "EpisodeDate"), PropertyListValue(kDate));
  EXPECT_EQ(*platform::valueForKey(dictionary, "EpisodeOrder"), PropertyListValue(std::int64_t{7}));
  EXPECT_EQ(*platform::valueForKey(dictionary, "EpisodeFileSize"),
            PropertyListValue(std::uint64_t{18446744073709551615U}));

  const auto again = QELEpisode::episodeWithDictionary(&dictionary);
  EXPECT_EQ(again->dictionary(), dictionary);
}

TEST(QELEpisodeTest, ReferenceTypesAreDerivedOnlyWhereTheyAreMissing) {
  const struct {
    std::optional<const char*> location;
    std::optional<const char*> stored;
    OptionalText type;
  } rows[] = {
      {"http://a.example/1.mp3", std::nullopt, "remote"},
      {"FiLe:///a.mp3", std::nullopt, "remote"},
      {"/tmp/a.mp3", std::nullopt, "local"},
      {"", std::nullopt, std::nullopt},
      {std::nullopt, std::nullopt, std::nullopt},
      {"http://a.example/1.mp3", "local", "local"},
      {"http://a.example/1.mp3", "", ""},
      {std::nullopt, "Remote", "Remote"},
  };
  for (const auto& row : rows) {
    Dictionary dictionary;
    if (row.location) {
      dictionary.emplace("EpisodeReference", *row.location);
      dictionary.emplace("EpisodePosterReference", *row.location);
    }
    if (row.stored) {
      dictionary.emplace("EpisodeReferenceType", *row.stored);
      dictionary.emplace("EpisodePosterReferenceType", *row.stored);
    }
    const auto episode = QELEpisode::episodeWithDictionary(&dictionary);
    EXPECT_EQ(episode->referenceType(), row.type) << row.location.value_or("(absent)");
    EXPECT_EQ(episode->posterReferenceType(), row.type) << row.location.value_or("(absent)");
  }
}

TEST(QELEpisodeTest, OrdersAreReadAsSignedIntegers) {
  const struct {
    PropertyListValue value;
    std::int64_t order;
  } rows[] = {
      {"12abc", 12},
      {"  12abc", 12},
      {"\n\t 3\n", 3},
      {"abc", 0},
      {"", 0},
      {"-4", -4},
      {"+4", 4},
      {std::int64_t{0}, 0},
      {std::int64_t{-5}, -5},
      {12.75, 12},
      {"99999999999999999999", INT64_MAX},
      {PropertyListValue::Array{}, -1},
  };
  for (const auto& row : rows) {
    const Dictionary feedItem{{"order", row.value}};
    const Dictionary reference{{"EpisodeOrder", row.value}};
    EXPECT_EQ(QELEpisode::episodeWithFeedDictionary(&feedItem)->orvaneOrder(), row.order);
    EXPECT_EQ(QELEpisode::episodeWithDictionary(&reference)->orvaneOrder(), row.order);
  }
}

TEST(QELEpisodeTest, NegativeOrderIsReadButNotWritten) {
  const Dictionary dictionary{{"EpisodeOrder", std::int64_t{-5}}};
  const auto episode = QELEpisode::episodeWithDictionary(&dictionary);
  EXPECT_EQ(episode->orvaneOrder(), -5);
  EXPECT_EQ(episode->dictionary(), Dictionary());
  const Dictionary written = episode->dictionary();
  EXPECT_EQ(QELEpisode::episodeWithDictionary(&written)->orvaneOrder(), -1);
}

TEST(QELEpisodeTest, UnknownFileSizeIsNotWritten) {
  const Dictionary dictionary{{"EpisodeFileSize", std::int64_t{0}}};
  const auto episode = QELEpisode::episodeWithDictionary(&dictionary);
  EXPECT_EQ(episode->contentLength(), 0U);
  EXPECT_EQ(episode->dictionary(), Dictionary());
}

TEST(QELEpisodeTest, FileSizesAreReadAsUnsignedIntegers) {
  const struct {
    PropertyListValue value;
    std::uint64_t length;
  } rows[] = {
      {std::int64_t{5}, 5},
      {std::uint64_t{18446744073709551615U}, 18446744073709551615U},
      {std::int64_t{-5}, 0},
      {"123 bytes", 123},
      {true, 0},
      {PropertyListValue::Array{}, 0},
  };
  for (const auto& row : rows) {
    const Dictionary reference{{"EpisodeFileSize", row.value}};
    const Dictionary feedItem{{"contentLength", row.value}};
    EXPECT_EQ(QELEpisode::episodeWithDictionary(&reference)->contentLength(), row.length);
    EXPECT_EQ(QELEpisode::episodeWithFeedDictionary(&feedItem)->contentLength(), row.length);
  }
}

TEST(QELEpisodeTest, ValuesOfUnexpectedKindsAreConvertedOrAbsent) {
  const Dictionary dictionary{{"EpisodeName", std::int64_t{42}},
                              {"EpisodeAuthor", PropertyListValue::Array{}},
                              {"EpisodeDate", "yesterday"},
                              {"EpisodeReference", Dictionary{}},
                              {"EpisodeReferenceType", kDate}};
  const auto episode = QELEpisode::episodeWithDictionary(&dictionary);
  EXPECT_EQ(episode->title(), "42");
  EXPECT_EQ(episode->author(), std::nullopt);
  EXPECT_EQ(episode->date(), std::nullopt);
  EXPECT_EQ(episode->location(), std::nullopt);
  EXPECT_EQ(episode->referenceType(), std::nullopt);
}

TEST(QELEpisodeTest, EmptyTitleIsPresentAndWritten) {
  const Dictionary dictionary{{"EpisodeName", ""}};
  const auto episode = QELEpisode::episodeWithDictionary(&dictionary);
  EXPECT_EQ(episode->title(), "");
  EXPECT_EQ(episode->dictionary(), dictionary);
}

TEST(QELEpisodeTest, TextsAreCopiedWhenTheyAreSet) {
  std::string title = "before";
  const auto episode = QELEpisode::episode();
  episode->setTitle(Text(title));
  title = "after";
  EXPECT_EQ(episode->title(), "before");
}

TEST(QELEpisodeTest, DescriptionNamesClassAndTitle) {
  const auto episode = QELEpisode::episode();
  EXPECT_EQ(episode->description(), "<QELEpisode: \"(null)\">");
  episode->setTitle("Pilot");
  EXPECT_EQ(episode->description(), "<QELEpisode: \"Pilot\">");
}

/// Runs the writer and the reader side by side until the reader has seen enough.
template <typename Write, typename Read>
void race(Write write, Read read) {
  constexpr int kRounds = 20000;
  std::atomic<bool> done = false;
  std::thread writer([&] {
    for (std::size_t round = 0; !done; ++round) write(round);
  });
  for (int round = 0; round < kRounds; ++round) read();
  done = true;
  writer.join();
}

// Meant for the thread sanitizer; without it, half-made values show as a wrong text or a crash.
TEST(QELEpisodeTest, ThreadsSeeWholeTexts) {
  const auto episode = QELEpisode::episode();
  const std::string values[] = {std::string(100, 'a'), std::string(200, 'b'), ""};
  for (const TextField& field : kTextFields) {
    race(
        [&](std::size_t round) {
          const std::size_t choice = round % 4;
          (episode.get()->*field.set)(choice < 3 ? OptionalText(Text(values[choice]))
                                                 : std::nullopt);
        },
        [&] {
          const OptionalText seen = (episode.get()->*field.get)();
          ASSERT_TRUE(!seen || *seen == values[0] || *seen == values[1] || *seen == values[2])
              << field.referenceKey;
        });
  }
}

TEST(QELEpisodeTest, ThreadsSeeWholeDatesAndNumbers) {
  const auto episode = QELEpisode::episode();
  const PointInTime dates[] = {kDate, PointInTime(-1ms)};
  race(
      [&](std::size_t round) {
        episode->setDate(dates[round % 2]);
        episode->setOrvaneOrder(round % 2 == 0 ? 1 : INT64_MIN);
        episode->setContentLength(round % 2 == 0 ? 1 : UINT64_MAX);
      },
      [&] {
        const auto date = episode->date();
        ASSERT_TRUE(!date || *date == dates[0] || *date == dates[1]);
        const std::int64_t order = episode->orvaneOrder();
        ASSERT_TRUE(order == 0 || order == 1 || order == INT64_MIN);
        const std::uint64_t length = episode->contentLength();
        ASSERT_TRUE(length == 0 || length == 1 || length == UINT64_MAX);
      });
}

}  // namespace
