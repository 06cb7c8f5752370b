#pragma once

#include "platform/api/AccountService.h"
#include "platform/api/Clock.h"
#include "platform/api/ContainerFiles.h"
#include "platform/api/Counters.h"
#include "platform/api/DeviceManagement.h"
#include "platform/api/DeviceProperties.h"
#include "platform/api/FileManager.h"
#include "platform/api/Interprocess.h"
#include "platform/api/KnowledgeStore.h"
#include "platform/api/LaunchEvents.h"
#include "platform/api/LinguisticTagger.h"
#include "platform/api/LocaleService.h"
#include "platform/api/LocationService.h"
#include "platform/api/Log.h"
#include "platform/api/MapsService.h"
#include "platform/api/MemoryPressure.h"
#include "platform/api/NetworkProxyService.h"
#include "platform/api/NotificationCenter.h"
#include "platform/api/ProcessTransactions.h"
#include "platform/api/PropertyList.h"
#include "platform/api/RandomSource.h"
#include "platform/api/SettingsStore.h"
#include "platform/api/Signals.h"
#include "platform/api/SystemNotifications.h"
#include "platform/api/TextInputService.h"
#include "platform/api/TraceSink.h"
#include "platform/api/URLSession.h"
#include "platform/api/WorkQueues.h"

namespace zelkord {

// Every service of the host, as the daemon sees it. `main` makes one on Linux, each test one on
// fakes; whoever makes it keeps the services alive longer than the daemon's objects. A service that
// the host lacks is one that answers "nothing", never a null reference.
struct Platform {
  Clock& clock;
  WorkQueues& queues;
  LogSink& log;
  SettingsStore& settings;
  FileManager& files;
  ContainerFiles& containerFiles;
  NotificationCenter& notificationCenter;
  SystemNotifications& systemNotifications;
  ProcessTransactions& transactions;
  Counters& counters;
  TraceSink& trace;
  Signals& signals;
  ProcessControl& process;
  LaunchEvents& launchEvents;
  PropertyListCoder& propertyLists;
  URLSessions& urlSessions;
  ipc::Interprocess& interprocess;
  DeviceProperties& device;
  LocaleService& locale;
  MapsService& maps;
  AccountService& accounts;
  DeviceManagement& management;
  LocationService& location;
  NetworkProxyService& networkProxy;
  LinguisticTagger& tagger;
  TextInputService& textInput;
  RandomSource& random;
  MemoryPressure& memoryPressure;
  KnowledgeStore& knowledge;
};

}  // namespace zelkord
