#pragma once

#include "platform/api/CountedTransactions.h"
#include "platform/api/LaunchEventStreams.h"
#include "platform/api/Platform.h"
#include "platform/testing/FakeAccounts.h"
#include "platform/testing/FakeCounters.h"
#include "platform/testing/FakeDevice.h"
#include "platform/testing/FakeFileManager.h"
#include "platform/testing/FakeInterprocess.h"
#include "platform/testing/FakeKnowledgeStore.h"
#include "platform/testing/FakeLocale.h"
#include "platform/testing/FakeLocation.h"
#include "platform/testing/FakeManagement.h"
#include "platform/testing/FakeMaps.h"
#include "platform/testing/FakeMemoryPressure.h"
#include "platform/testing/FakeNetworkProxy.h"
#include "platform/testing/FakePropertyLists.h"
#include "platform/testing/FakeSettings.h"
#include "platform/testing/FakeSignals.h"
#include "platform/testing/FakeTagger.h"
#include "platform/testing/FakeTextInput.h"
#include "platform/testing/FakeURLSessions.h"
#include "platform/testing/ManualTimeline.h"
#include "platform/testing/RecordingLog.h"
#include "platform/testing/RecordingProcess.h"
#include "platform/testing/RecordingSystemNotifications.h"
#include "platform/testing/RecordingTrace.h"
#include "platform/testing/SeededRandom.h"

namespace zelkord {

// A whole platform of fakes: what the daemon sees through `platform()`, the test holds as members.
//
//   FakePlatform fakes;
//   fakes.settings.set("ZLKUseMorvane", true);
//   Assembly assembly(fakes.platform());
//   fakes.timeline.advance(1s);
//
// Threading: the test's thread. Ownership: outlives the daemon's objects.
class FakePlatform final {
 public:
  FakePlatform() = default;
  // With real directories, for components that open files by themselves.
  explicit FakePlatform(Directories directories) : files(std::move(directories)) {}
  FakePlatform(const FakePlatform&) = delete;
  FakePlatform& operator=(const FakePlatform&) = delete;

  Platform& platform() { return platform_; }

  ManualTimeline timeline;  // the clock and all queues

  RecordingLog log;
  FakeSettings settings;
  FakeFileManager files;
  NotificationCenter notificationCenter;
  RecordingSystemNotifications systemNotifications;
  CountedTransactions transactions{timeline};
  FakeCounters counters;
  RecordingTrace trace;
  FakeSignals signals;
  RecordingProcess process{timeline};
  LaunchEventStreams launchEvents;
  FakePropertyLists propertyLists;
  FakeURLSessions urlSessions{timeline, &files};
  ipc::FakeInterprocess interprocess{timeline};
  FakeDevice device;
  FakeLocale locale;
  FakeMaps maps;
  FakeAccounts accounts;
  FakeManagement management;
  FakeLocation location;
  FakeNetworkProxy networkProxy;
  FakeTagger tagger;
  FakeTextInput textInput;
  SeededRandom random;
  FakeMemoryPressure memoryPressure;
  FakeKnowledgeStore knowledge;

 private:
  Platform platform_{timeline,
                     timeline,
                     log,
                     settings,
                     files,
                     files,
                     notificationCenter,
                     systemNotifications,
                     transactions,
                     counters,
                     trace,
                     signals,
                     process,
                     launchEvents,
                     propertyLists,
                     urlSessions,
                     interprocess,
                     device,
                     locale,
                     maps,
                     accounts,
                     management,
                     location,
                     networkProxy,
                     tagger,
                     textInput,
                     random,
                     memoryPressure,
                     knowledge};
};

}  // namespace zelkord
