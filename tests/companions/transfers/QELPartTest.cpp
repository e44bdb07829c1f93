#include "companions/transfers/QELPart.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <csignal>
#include <filesystem>
#include <optional>
#include <string>

#include "platform/process/SystemStart.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/TemporaryDirectory.h"

namespace {

namespace fs = std::filesystem;

class QELPartTest : public testing::Test {
 protected:
  void SetUp() override {
    platform::ErrorSlot error;
    directory_ = *platform::Directory::open(path_, error);
  }
  QELPart part(const std::string& url, const std::string& title = "\"One\"") const {
    return {directory_, path_, url, title};
  }
  void write(const std::string& name, const std::string& content) { root_.addFile(name, content); }

  TemporaryDirectory root_;
  std::string path_ = root_.path();
  platform::Directory directory_;
};

TEST_F(QELPartTest, ANoteVouchesForAPart) {
  const QELPart one = part("https://a.example/1.mp3");
  EXPECT_EQ(one.name(), ".qel-keep-115081c6eee022e7.part");
  one.note("\"tag\"", "1.mp3", std::nullopt);
  EXPECT_EQ(one.validator(), "");  // no part
  write(one.name(), "");
  EXPECT_EQ(one.validator(), "");
  write(one.name(), "half");
  EXPECT_EQ(one.validator(), "\"tag\"");
  one.removeNote();
  EXPECT_EQ(one.validator(), "");
  EXPECT_TRUE(fs::exists(root_ / one.name()));
}

TEST_F(QELPartTest, ANoteOfAnotherURLOrAnotherStartVouchesForNothing) {
  const QELPart one = part("https://a.example/1.mp3");
  write(one.name(), "half");
  one.note("\"tag\"", "1.mp3", 5);
  const std::string note = ".qel-keep-115081c6eee022e7.note";
  std::string content = contentOf(root_ / note);
  const std::string start = platform::systemStart();
  ASSERT_NE(start, "");
  ASSERT_TRUE(content.starts_with(start + "\n")) << content;
  write(note, std::string(start.size(), '0').append(content, start.size()));
  EXPECT_EQ(one.validator(), "");
  write(note, content);
  EXPECT_EQ(one.validator(), "\"tag\"");
  write(note, content + "\nHost: b.example");
  EXPECT_EQ(one.validator(), "");
  std::string steering = content;
  write(note, steering.insert(steering.find("\"tag"), 1, '\r'));
  EXPECT_EQ(one.validator(), "");
  for (const char* character : {"\x7F", "\x1F", "\u00E9"}) {
    std::string unprintable = content;
    write(note, unprintable.insert(unprintable.find("tag"), character));
    EXPECT_EQ(one.validator(), "") << character;
  }
  for (const char* character : {"~", " "}) {
    std::string printable = content;
    write(note, printable.insert(printable.find("tag"), character));
    EXPECT_EQ(one.validator(), std::string("\"") + character + "tag\"");
  }
  content.replace(content.find("/1.mp3"), 6, "/2.mp3");
  write(note, content);
  EXPECT_EQ(one.validator(), "");
}

TEST_F(QELPartTest, AWholeFileIsFoundAgain) {
  const QELPart one = part("https://a.example/1.mp3");
  one.note("", "1.mp3", 5);
  EXPECT_EQ(one.finishedName(), std::nullopt);
  write("1.mp3", "whole");
  EXPECT_EQ(one.finishedName(), "1.mp3");
  EXPECT_EQ(one.validator(), "");
  write("1.mp3", "another");
  EXPECT_EQ(one.finishedName(), std::nullopt);
  one.note("", "1.mp3", std::nullopt);
  EXPECT_EQ(one.finishedName(), "1.mp3");
  write(one.name(), "");
  EXPECT_EQ(one.finishedName(), std::nullopt);  // it is not the part's file
  one.remove();
  EXPECT_EQ(one.finishedName(), std::nullopt);
}

TEST_F(QELPartTest, ANoteIsWrittenWholeOrNotAtAll) {
  const QELPart one = part("https://a.example/1.mp3");
  write(one.name(), "half");
  one.note("\"old\"", "1.mp3", 5);
  // What stands there is not replaced by half a note.
  EXPECT_TRUE(holdsInChild([&] {
    std::signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{20, 20};
    ::setrlimit(RLIMIT_FSIZE, &limit);
    one.note("\"new\"", "1.mp3", 5);
    return true;
  }));
  EXPECT_EQ(one.validator(), "\"old\"");
  fs::remove_all(path_);
  one.note("\"new\"", "1.mp3", 5);
  EXPECT_EQ(one.validator(), "");
  EXPECT_FALSE(fs::exists(path_));
}

TEST_F(QELPartTest, AnotherEpisodeOfOneURLHasNoShareInIt) {
  const QELPart one = part("https://a.example/latest.mp3");
  one.note("\"tag\"", "latest.mp3", 5);
  write("latest.mp3", "whole");
  const QELPart two = part("https://a.example/latest.mp3", "\"Two\"");
  EXPECT_EQ(one.finishedName(), "latest.mp3");
  EXPECT_EQ(two.finishedName(), std::nullopt);
  EXPECT_NE(one.name(), two.name());
}

TEST_F(QELPartTest, PartsAreRemovedWithTheirNotes) {
  const QELPart one = part("https://a.example/1.mp3");
  const QELPart two = part("https://a.example/2.mp3");
  for (const QELPart& each : {one, two}) {
    write(each.name(), "half");
    each.note("\"tag\"", "1.mp3", 5);
  }
  write(".qel-0123456789abcdef.part", "not ours");
  write("one.mp3", "whole");
  one.remove();
  EXPECT_EQ(one.validator(), "");
  EXPECT_EQ(two.validator(), "\"tag\"");
  write(one.name(), "half");
  QELPart::removeAllBut({two.name()}, directory_, path_);
  EXPECT_EQ(two.validator(), "\"tag\"");
  EXPECT_FALSE(fs::exists(root_ / one.name()));
  QELPart::removeAllBut({}, directory_, path_);
  std::size_t count = 0;
  for (const auto& entry : fs::directory_iterator(path_)) count += entry.is_regular_file() ? 1 : 0;
  EXPECT_EQ(count, 2U);
}

}  // namespace
