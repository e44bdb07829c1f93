#include "cli/common/QELError.h"

#include <gtest/gtest.h>

TEST(QELErrorTest, RecordCarriesDomainCodeAndDescription) {
  const platform::ErrorRecord record = QELError(3, "The feed was neither RSS nor Atom");
  EXPECT_EQ(record.domain, "QELDomain");
  EXPECT_EQ(record.code, 3);
  EXPECT_EQ(record.description, "The feed was neither RSS nor Atom");
}
