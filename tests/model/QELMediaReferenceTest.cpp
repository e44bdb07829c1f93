#include "model/QELMediaReference.h"

#include <gtest/gtest.h>

namespace {

using platform::OptionalText;

TEST(QELMediaReferenceTest, ExactlyRemoteLocationsThatAreURLsHaveOne) {
  const struct {
    OptionalText location, referenceType;
    bool isRemote, hasURL;
  } rows[] = {
      {"http://a.example/1.mp3", "remote", true, true},
      {"file:///1.mp3", "remote", true, true},
      {"http://a b/", "remote", true, false},
      {"/1.mp3", "remote", true, false},
      {std::nullopt, "remote", true, false},
      {"http://a.example/1.mp3", "local", false, false},
      {"http://a.example/1.mp3", "Remote", false, false},
      {"http://a.example/1.mp3", "", false, false},
      {"http://a.example/1.mp3", std::nullopt, false, false},
  };
  for (const auto& row : rows) {
    const QELMediaReference reference(row.location, row.referenceType);
    EXPECT_EQ(reference.location, row.location);
    EXPECT_EQ(reference.isRemote, row.isRemote) << testing::PrintToString(row.location);
    EXPECT_EQ(reference.url.has_value(), row.hasURL) << testing::PrintToString(row.location);
  }
}

}  // namespace
