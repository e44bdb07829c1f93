#include "generators/QELPodcastGenerator.h"

#include <gtest/gtest.h>

TEST(QELPodcastGeneratorTest, AbstractGenerationFailsWithCodeOne) {
  QELPodcastGenerator generator;
  QELPodcastSource source;
  platform::ErrorSlot error;
  EXPECT_FALSE(generator.generateFromSource(source, error));
  EXPECT_EQ(error, (platform::ErrorRecord{"QELDomain", 1,
                                          "Attempt to generate with an abstract generator"}));
}
