#include "companions/common/QELFindings.h"

#include <gtest/gtest.h>

#include <string>

namespace {

std::string printed(QELFindings& findings, bool expected) {
  testing::internal::CaptureStdout();
  EXPECT_EQ(findings.print(), expected);
  fflush(stdout);
  return testing::internal::GetCapturedStdout();
}

QELPlace at(std::size_t line, std::size_t column) {
  return {.position = platform::TextPosition{.line = line, .column = column}};
}

TEST(QELFindingsTest, AreSortedByTheirPlace) {
  QELFindings findings("f", 9);
  findings.add(QELSeverity::kNote, {}, "last %@", {"one"});
  findings.add(QELSeverity::kError, at(2, 1), "c");
  findings.add(QELSeverity::kWarning, at(1, 10), "b");
  findings.add(QELSeverity::kNote, at(1, 9), "a");
  findings.add(QELSeverity::kNote, at(1, 9), "a2");
  findings.add(QELSeverity::kNote, {.path = "K[1]", .file = "g"}, "x");
  EXPECT_EQ(printed(findings, true),
            "f:1:9: note: a\nf:1:9: note: a2\nf:1:10: warning: b\nf:2:1: error: c\n"
            "f: note: last one\ng: note: K[1]: x\n");
}

TEST(QELFindingsTest, NotesAloneAreNothingToLookAt) {
  QELFindings findings("f", 9);
  EXPECT_EQ(printed(findings, false), "");
  findings.add(QELSeverity::kNote, {}, "a");
  EXPECT_EQ(printed(findings, false), "f: note: a\n");
}

TEST(QELFindingsTest, ThoseOfAKindAreToldInAFewPlaces) {
  QELFindings findings("f", 2);
  for (const char* const name : {"a", "b", "c", "d"}) {
    findings.add(QELSeverity::kWarning, {}, "bad %@", {name});
  }
  findings.add(QELSeverity::kWarning, {}, {"bad %@", "other"}, {"e"});
  findings.add(QELSeverity::kWarning, {}, {"bad %@", "other"}, {"f"});
  EXPECT_EQ(printed(findings, true),
            "f: warning: bad a\n"
            "f: warning: bad b (and 2 more like this; --all shows them)\n"
            "f: warning: bad e\nf: warning: bad f\n");
}

TEST(QELFindingsTest, TextsAreShownOnOneLineAndShortened) {
  EXPECT_EQ(QELQuoted(" a\n\t b "), "\"a b\"");
  EXPECT_EQ(QELQuoted(""), "\"\"");
  EXPECT_EQ(QELQuoted(std::string(60, 'x')), "\"" + std::string(60, 'x') + "\"");
  EXPECT_EQ(QELQuoted(std::string(61, 'x')), "\"" + std::string(60, 'x') + "...\"");
  EXPECT_EQ(QELQuoted("\u00FC\u00FC"), "\"\u00FC\u00FC\"");
}

TEST(QELFindingsTest, NumbersAreListedWithTheLargestFirst) {
  EXPECT_EQ(QELListed({}), "");
  EXPECT_EQ(QELListed({{"a", 1}, {"b", 3}, {"c", 1}}), "3 \"b\", 1 \"a\", 1 \"c\"");
  std::map<std::string, std::size_t> many;
  for (char name = 'a'; name <= 'n'; ++name) many[std::string(1, name)] = 1;
  EXPECT_TRUE(QELListed(many).ends_with("1 \"l\", and 2 others"));
}

}  // namespace
