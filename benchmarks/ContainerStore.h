#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

#include "benchmarks/QuietLog.h"
#include "platform/linux/files/LinuxContainerFiles.h"
#include "platform/linux/files/LinuxFileManager.h"
#include "platform/linux/queues/LinuxWorkQueues.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformOnQueues.h"
#include "platform/testing/TemporaryDirectory.h"
#include "zelkord/assembly/Assembly.h"
#include "zelkord/storage/StorageTestSupport.h"
#include "zelkord/storage/ZelkorPersistentStorage.h"

namespace zelkord {

using Steady = std::chrono::steady_clock;

inline double microsecondsSince(Steady::time_point start) {
  return std::chrono::duration<double, std::micro>(Steady::now() - start).count();
}

// Storage in a directory of its own, on real queues.
struct ContainerStore {
  explicit ContainerStore(std::int64_t limit = std::int64_t{1} << 40) {
    fakes.settings.set("ZLKSessionSizeLimit", limit);
    fakes.settings.set("ZLKSessionMaxAge", 1e9);
  }
  std::shared_ptr<SessionContainer> container() {
    auto container = storage->createFileContainerForWriting(SessionKind::Managed, {});
    container->writeSessionHeader(testHeader());
    return container;
  }

  TemporaryDirectory root;
  LinuxClock clock;
  FakePlatform fakes;  // outlives the queues' threads
  LinuxWorkQueues queues{clock};
  FakeURLSessions sessions{queues};
  CountedTransactions transactions{clock};
  QuietLog log;
  LinuxFileManager files{{root.path(), root.path(), root.path()}};
  LinuxContainerFiles containerFiles;
  Platform platform = onQueues(fakes.platform(), clock, queues, sessions, transactions, &log,
                               {&files, &containerFiles});
  Assembly assembly{platform};
  std::shared_ptr<ZelkorPersistentStorage> storage =
      std::make_shared<ZelkorPersistentStorage>(assembly);
};

// An engagement's size.
inline ZelkorFeedback commonFeedback(std::int64_t number) {
  return numberedFeedback(number, 1, std::string(200, 'x'));
}

}  // namespace zelkord
