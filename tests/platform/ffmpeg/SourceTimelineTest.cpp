// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/SourceTimeline.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

namespace quilt::platform::ffmpeg {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::SizeIs;

constexpr AVRational kThousandths{1, 1000};

class SourceTimelineTest : public ::testing::Test {
 protected:
  // Stamps a packet of 40 ms that says `time`, in milliseconds.
  static std::int64_t place(SourceTimeline& timeline, std::int64_t time, int stream = 0) {
    const Packet packet(av_packet_alloc());
    packet->stream_index = stream;
    packet->dts = time;
    packet->pts = time + 80;
    packet->duration = 40;
    timeline.place(*packet, kThousandths);
    EXPECT_EQ(packet->pts, packet->dts + 80);
    return packet->dts;
  }
};

TEST_F(SourceTimelineTest, TheFileStartsAtZero) {
  SourceTimeline timeline(1.4, true, 10);
  EXPECT_EQ(place(timeline, 1400), 0);
  EXPECT_EQ(place(timeline, 1440), 40);
}

TEST_F(SourceTimelineTest, PacketsWithoutTimesStayWithout) {
  SourceTimeline timeline(1, true, 10);
  const Packet packet(av_packet_alloc());
  timeline.place(*packet, kThousandths);
  EXPECT_EQ(packet->dts, AV_NOPTS_VALUE);
  EXPECT_EQ(packet->pts, AV_NOPTS_VALUE);
}

TEST_F(SourceTimelineTest, JoinedRecordingsRunOn) {
  SourceTimeline timeline(0, true, 0);
  EXPECT_EQ(place(timeline, 0), 0);
  EXPECT_EQ(place(timeline, 40), 40);
  EXPECT_EQ(place(timeline, 5'000'000), 80);
  EXPECT_EQ(place(timeline, 5'000'040), 120);
  EXPECT_EQ(place(timeline, 90'000), 160) << "a counter that starts anew";
}

TEST_F(SourceTimelineTest, ShortRecordingsThatAllStartAlikeRunOn) {
  SourceTimeline timeline(1.4, true, 0);
  for (std::int64_t time = 0; time < 5000; time += 40) EXPECT_EQ(place(timeline, 1400 + time), time);
  for (std::int64_t time = 0; time < 5000; time += 40) EXPECT_EQ(place(timeline, 1400 + time), 5000 + time);
}

TEST_F(SourceTimelineTest, AllStreamsLeapTogetherAndKeepTheirDistance) {
  SourceTimeline timeline(0, true, 0);
  EXPECT_EQ(place(timeline, 0, 0), 0);
  EXPECT_EQ(place(timeline, 20, 1), 20);
  EXPECT_EQ(place(timeline, 100'000, 0), 60) << "after the stream that reached farthest";
  EXPECT_EQ(place(timeline, 60, 1), 60) << "still of what came before";
  EXPECT_EQ(place(timeline, 100'040, 0), 100);
  EXPECT_EQ(place(timeline, 100'020, 1), 80);
}

TEST_F(SourceTimelineTest, PausesAreKeptWhereTimesAreReliable) {
  SourceTimeline timeline(0, false, 120);
  EXPECT_EQ(place(timeline, 0), 0);
  EXPECT_EQ(place(timeline, 60'000), 60'000);
  EXPECT_EQ(place(timeline, 900'000'000), 60'040) << "but not far past the end of the file";
}

class FrameClockTest : public ::testing::Test {
 protected:
  static std::vector<std::int64_t> places(FrameClock clock, const std::vector<std::int64_t>& times) {
    std::vector<std::int64_t> result;
    for (const std::int64_t time : times) {
      const std::int64_t place = clock.place(time);
      if (place != AV_NOPTS_VALUE) result.push_back(place);
    }
    return result;
  }
  static std::vector<std::int64_t> every(double step, int count) {
    std::vector<std::int64_t> times;
    for (int i = 0; i < count; ++i) times.push_back(static_cast<std::int64_t>(i * step));
    return times;
  }
  FrameClock _clock{kThousandths, {25, 1}, FrameClock::Start::Lengthened};
};

TEST_F(FrameClockTest, TimesThatRiseAreKept) {
  EXPECT_THAT(places(_clock, {0, 40, 50, 170, 2000}), ElementsAre(0, 40, 170, 2000)) << "10 ms is too fast";
  EXPECT_THAT(places(_clock, {0, 33, 67, 100, 133}), ElementsAre(0, 33, 67, 100, 133));
}

TEST_F(FrameClockTest, TheFirstPictureIsShownFromTheStart) {
  EXPECT_THAT(places(_clock, {500, 540, 580}), ElementsAre(0, 540, 580));
  const FrameClock alone(kThousandths, {25, 1}, FrameClock::Start::Moved);
  EXPECT_THAT(places(alone, {500, 540, 580}), ElementsAre(0, 40, 80));
}

TEST_F(FrameClockTest, APictureWithoutATimeFollowsTheOneBefore) {
  EXPECT_THAT(places(_clock, {0, AV_NOPTS_VALUE, AV_NOPTS_VALUE, 120}), ElementsAre(0, 40, 80, 120));
  EXPECT_THAT(places(_clock, std::vector<std::int64_t>(5, AV_NOPTS_VALUE)), ElementsAre(0, 40, 80, 120, 160));
}

TEST_F(FrameClockTest, ATimeThatGoesBackIsRepaired) {
  EXPECT_THAT(places(_clock, {0, 80, 40, 120, 160}), ElementsAre(0, 80, 100, 120, 160));
}

TEST_F(FrameClockTest, APictureDoesNotLastForDays) {
  EXPECT_THAT(places(_clock, {0, 40, 3'600'000, 900'000'000, 900'000'040}),
              ElementsAre(0, 40, 3'600'000, 3'600'040, 3'600'080));
}

TEST_F(FrameClockTest, SixtyPicturesASecondPassAndMoreAreThinned) {
  EXPECT_THAT(places(_clock, every(1000.0 / 60, 120)), SizeIs(120)) << "rounded to milliseconds";
  EXPECT_THAT(places(_clock, every(1000.0 / 120, 240)),
              SizeIs(::testing::AllOf(::testing::Ge(118), ::testing::Le(122))));
  EXPECT_THAT(places(_clock, every(1, 2000)), SizeIs(::testing::AllOf(::testing::Ge(115), ::testing::Le(122))));
}

}  // namespace
}  // namespace quilt::platform::ffmpeg
