#include <gtest/gtest.h>

#include <vector>

#include "platform/api/LaunchEventStreams.h"
#include "platform/testing/ManualTimeline.h"

namespace zelkord {
namespace {

using Events = std::vector<std::string>;

class LaunchEventStreamsTest : public testing::Test {
 protected:
  Subscription handleInto(Events& events) {
    return streams_.handle("stream", *queue_, [&](const std::string& name) {
      queue_->assertCurrent();
      events.push_back(name);
    });
  }

  ManualTimeline timeline_;
  const std::unique_ptr<SerialQueue> queue_ = timeline_.makeSerialQueue("events");
  LaunchEventStreams streams_;
};

TEST_F(LaunchEventStreamsTest, EventsWaitForAHandlerAndKeepTheirOrder) {
  streams_.deliver("stream", "1");
  streams_.deliver("stream", "2");
  streams_.deliver("another", "x");
  Events events;
  const auto handling = handleInto(events);
  streams_.deliver("stream", "3");
  EXPECT_TRUE(events.empty());
  timeline_.runUntilIdle();
  EXPECT_EQ(events, (Events{"1", "2", "3"}));
}

TEST_F(LaunchEventStreamsTest, WhatACancelledHandlerDidNotGetGoesToTheNext) {
  Events first, second;
  auto handling = handleInto(first);
  streams_.deliver("stream", "1");
  timeline_.runUntilIdle();
  streams_.deliver("stream", "2");
  handling.reset();
  timeline_.runUntilIdle();
  handling = handleInto(second);
  timeline_.runUntilIdle();
  EXPECT_EQ(first, Events{"1"});
  EXPECT_EQ(second, Events{"2"});
}

TEST_F(LaunchEventStreamsTest, ALaterHandlerReplacesTheFormer) {
  Events first, second;
  auto former = handleInto(first);
  streams_.deliver("stream", "1");
  const auto later = handleInto(second);
  former.reset();  // ends nothing any more
  streams_.deliver("stream", "2");
  timeline_.runUntilIdle();
  EXPECT_TRUE(first.empty());
  EXPECT_EQ(second, (Events{"1", "2"}));
}

}  // namespace
}  // namespace zelkord
