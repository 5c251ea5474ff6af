#include <gtest/gtest.h>

#include <chrono>
#include <thread>

#include "support.h"
#include "kernite/Kernite.h"

using Kernite::System::DateTime;
using Kernite::System::ScheduledItem;
using TestSupport::MessageOf;

namespace {

constexpr std::int64_t kUs = 1000000;

TEST(DateTimeTest, TextRoundTripsAndKnownInstants) {
    for (const char* text : {"2026-12-06T09:49:01Z", "2026-12-06T09:49:01.250Z", "1970-01-01T00:00:00Z",
                             "1969-12-31T23:59:59.999999Z", "2000-02-29T12:00:00.000001Z", "0001-01-01T00:00:00Z",
                             "9999-12-31T23:59:59.999999Z", "1600-03-01T00:00:00.001Z"}) {
        EXPECT_EQ(DateTime::Parse(text).ToString(), text);
    }
    EXPECT_EQ(DateTime().ToString(), "1970-01-01T00:00:00Z");
    EXPECT_EQ(DateTime::Parse("1970-01-01T00:00:01Z").Microseconds(), kUs);
    EXPECT_EQ(DateTime::Parse("1969-12-31T23:59:59.999999Z").Microseconds(), -1);
    EXPECT_EQ(DateTime::Parse("2000-03-01T00:00:00Z").Microseconds(), 951868800 * kUs);
    EXPECT_EQ(DateTime::Parse("2026-12-06T09:49:01Z").Microseconds(), 1796550541 * kUs);
    EXPECT_EQ(DateTime::Parse("0001-01-01T00:00:00Z").Microseconds(), -62135596800 * kUs);
}

TEST(DateTimeTest, EveryInstantSurvivesFormattingAndParsing) {
    // A sweep across the whole four-digit range, on a step that lands on every day of
    // the year and on every kind of fraction.
    const std::int64_t first = -62135596800 * kUs;
    const std::int64_t last = 253402300799 * kUs;
    const std::int64_t step = 31556952 * kUs / 13 + 1234567;
    int checked = 0;
    for (std::int64_t us = first; us <= last; us += step, ++checked) {
        const DateTime t = DateTime::FromMicroseconds(us);
        ASSERT_EQ(DateTime::Parse(t.ToString()), t) << t.ToString();
    }
    EXPECT_GT(checked, 100000);
}

TEST(DateTimeTest, OffsetsAndFractionsNormaliseToUtc) {
    EXPECT_EQ(DateTime::Parse("2026-12-06T11:49:01+02:00"), DateTime::Parse("2026-12-06T09:49:01Z"));
    EXPECT_EQ(DateTime::Parse("2026-12-06T04:19:01-0530").ToString(), "2026-12-06T09:49:01Z");
    EXPECT_EQ(DateTime::Parse("2026-12-31T23:30:00-01:00").ToString(), "2027-01-01T00:30:00Z");
    EXPECT_EQ(DateTime::Parse("2026-12-06T09:49:01").ToString(), "2026-12-06T09:49:01Z");
    EXPECT_EQ(DateTime::Parse("2026-12-06T09:49:01.1234567Z").ToString(), "2026-12-06T09:49:01.123456Z");
    EXPECT_EQ(DateTime::Parse("2026-12-06T09:49:01,5Z").ToString(), "2026-12-06T09:49:01.500Z");
}

TEST(DateTimeTest, RejectsWhatIsNotADateTime) {
    for (const char* text :
         {"", "2026-12-06", "2026-13-01T00:00:00Z", "2026-00-10T00:00:00Z", "2023-02-29T00:00:00Z",
          "1900-02-29T00:00:00Z", "2026-04-31T00:00:00Z", "2026-12-06T24:00:00Z", "2026-12-06T09:60:00Z",
          "2026-12-06T09:49:60Z", "2026-12-06T09:49:01.Z", "2026-12-06T09:49:01Zjunk", "2026-12-06T09:49:01+2:00",
          "2026-12-06T09:49:01+02:60", " 2026-12-06T09:49:01Z", "2026-12-06 09:49:01Z", "26-12-06T09:49:01Z"}) {
        EXPECT_EQ(MessageOf<Kernite::InvalidArgumentException>([&] { DateTime::Parse(text); }),
                  std::string("Invalid argument : ") + text);
    }
    EXPECT_NO_THROW(DateTime::Parse("2000-02-29T00:00:00Z"));
}

TEST(DateTimeTest, OrdersByInstant) {
    const DateTime early = DateTime::Parse("2026-12-06T11:49:00+02:00");
    const DateTime late = DateTime::Parse("2026-12-06T09:49:00.000001Z");
    EXPECT_LT(early, late);
    EXPECT_GT(late, early);
    EXPECT_NE(early, late);
    EXPECT_LT(DateTime::Parse("1969-12-31T23:59:59Z"), DateTime());

    const auto before = std::chrono::system_clock::now();
    const DateTime now = DateTime::Now();
    const auto after = std::chrono::system_clock::now();
    auto us = [](auto tp) {
        return std::chrono::duration_cast<std::chrono::microseconds>(tp.time_since_epoch()).count();
    };
    EXPECT_LE(us(before), now.Microseconds());
    EXPECT_LE(now.Microseconds(), us(after));
}

TEST(ScheduledItemTest, WaitersWakeOnCompletionWithTheFailureClassKept) {
    Kernite::Ref<ScheduledItem> item(new ScheduledItem());
    EXPECT_EQ(item->GetState(), ScheduledItem::State::Pending);
    EXPECT_FALSE(item->WaitFor(std::chrono::milliseconds(1)));
    EXPECT_EQ(item->GetException(), nullptr);

    std::thread completer([item] {
        const Kernite::TypeMismatchException failure("wrong type");
        item->Complete(&failure);
    });
    item->Wait();
    completer.join();

    EXPECT_TRUE(item->IsDone());
    EXPECT_TRUE(item->IsFailed());
    ASSERT_NE(item->GetException(), nullptr);
    EXPECT_EQ(typeid(*item->GetException()), typeid(Kernite::TypeMismatchException));
    EXPECT_STREQ(item->GetException()->what(), "wrong type");
    EXPECT_TRUE(item->WaitFor(std::chrono::milliseconds(0)));
}

TEST(ScheduledItemTest, SuccessfulCompletionHasNoFailure) {
    Kernite::Ref<ScheduledItem> item(new ScheduledItem());
    item->Complete(nullptr);
    EXPECT_EQ(item->GetState(), ScheduledItem::State::Done);
    EXPECT_FALSE(item->IsFailed());
    EXPECT_EQ(item->GetException(), nullptr);
}

TEST(ScheduledItemDeathTest, CompletesOnlyOnce) {
    Kernite::Ref<ScheduledItem> item(new ScheduledItem());
    item->Complete(nullptr);
    EXPECT_DEATH(item->Complete(nullptr), "_state == State::Pending");
}

}  // namespace
