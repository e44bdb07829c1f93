#include "platform/net/TransferLibrary.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(TransferLibraryTest, FunctionsAreThoseOfTheLibraryThatTheHeadersDescribe) {
  ASSERT_FALSE(TransferLibrary::error());
  const TransferLibrary* const library = TransferLibrary::functions();
  ASSERT_NE(library, nullptr);
  EXPECT_STREQ(library->easyStrerror(CURLE_OUT_OF_MEMORY), "Out of memory");

  CURLU* const url = library->url();
  EXPECT_EQ(library->urlSet(url, CURLUPART_URL, "http://example.org/", 0), CURLUE_OK);
  EXPECT_EQ(library->urlSet(url, CURLUPART_URL, "http://", 0), CURLUE_NO_HOST);
  library->urlCleanup(url);
}

TEST(TransferLibraryTest, ErrorsAreShownWithoutWhatServersMadeUp) {
  EXPECT_EQ(transferError(CURLE_COULDNT_RESOLVE_HOST, "No host: \x1B[31m\u00E9\x7F~.\r\n"),
            (ErrorRecord{"transfer", 6, "No host: ?[31m???~"}));
  EXPECT_EQ(transferError(CURLE_RECV_ERROR, "...").description, "");
}

}  // namespace
}  // namespace platform
