#include "dates/RFC822Faults.h"

#include <gtest/gtest.h>

namespace {

TEST(RFC822FaultsTest, ADateInEnglishWithAKnownZoneHasNone) {
  for (const std::string_view text :
       {"Sat, 04 Apr 2026 04:30:00 GMT", "4 Apr 26 04:30 +0200", "31 DECEMBER 2026 23:59:60 -05:30",
        "1 Jan 0 0:0 z", "Foo, 04 may 2026 04:30 pdt", "29 Feb 2028 04:30 GMT",
        "4 Apr 2026 04:30 +2359", "29 Feb 28 04:30 GMT", "sunday, 29 Feb 2004 04:30 GMT",
        "Thu, 1 Jan 70 0:0 GMT"}) {
    EXPECT_EQ(RFC822Fault(text), "") << text;
  }
}

TEST(RFC822FaultsTest, TellsTheFirstFault) {
  struct Row {
    std::string_view text;
    std::string_view fault;
  };
  for (const Row& row : {
           Row{"", "it has not all of its parts"},
           Row{"Sat, 04 Apr 2026 04:30:00", "the day is none"},
           Row{"a Sat, 04 Apr 2026 04:30:00 GMT", "it has not all of its parts"},
           Row{"0 Apr 2026 04:30 GMT", "the day is none"},
           Row{"32 Apr 2026 04:30 GMT", "the day is none"},
           Row{"+4 Apr 2026 04:30 GMT", "the day is none"},
           Row{"31 Feb 2026 04:30 GMT", "the month has no such day"},
           Row{"29 Feb 2026 04:30 GMT", "the month has no such day"},
           Row{"31 Apr 2026 04:30 GMT", "the month has no such day"},
           Row{"Mon, 04 Apr 2026 04:30 GMT", "that day is a Saturday"},
           Row{"Sat, 05 Apr 2026 04:30 GMT", "that day is a Sunday"},
           Row{"SUNDAY 06 Apr 2026 04:30 GMT", "that day is a Monday"},
           Row{"4 Avr 2026 04:30 GMT", "the month is not known"},
           Row{"4 Ja 2026 04:30 GMT", "the month is not known"},
           Row{"4 anf 2026 04:30 GMT", "the month is not known"},
           Row{"Lun, 4 janv. 2026 04:30 GMT", "the month is not written as in RFC 822"},
           Row{"4 mars 2026 04:30 GMT", "the month is not written as in RFC 822"},
           Row{"4 Apr. 2026 04:30 GMT", "the month is not written as in RFC 822"},
           Row{"4 Sept 2026 04:30 GMT", "the month is not written as in RFC 822"},
           Row{"4 Apr 2026a 04:30 GMT", "the year is none"},
           Row{"4 Apr 2026 24:30 GMT", "the time is none"},
           Row{"4 Apr 2026 04:60 GMT", "the time is none"},
           Row{"4 Apr 2026 04:30:61 GMT", "the time is none"},
           Row{"4 Apr 2026 0430 GMT", "the time is none"},
           Row{"4 Apr 2026 04:30 UTC", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 +020", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 +05030", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 -2360", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 +02a0", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 j", "the time zone is not known"},
           Row{"4 Apr 2026 04:30 1", "the time zone is not known"},
           Row{"4 Apr 2026 :30 GMT", "the time is none"},
           Row{"4 Apr 2026 04: GMT", "the time is none"},
       }) {
    EXPECT_EQ(RFC822Fault(row.text), row.fault) << row.text;
  }
}

}  // namespace
