#pragma once

#include <memory>
#include <mutex>

#include "platform/api/SettingsStore.h"
#include "platform/api/URLSession.h"

namespace zelkord {

// The daemon's URL sessions, each made at its first use.
// Threading: any thread. Ownership: the platform outlives it.
class ServiceSessions final {
 public:
  ServiceSessions(URLSessions& sessions, const SettingsStore& settings)
      : sessions_(sessions), settings_(settings) {}

  // Queries and images.
  URLSession& urlSession();
  // The bag fetch.
  URLSession& bagSession();

 private:
  URLSessions& sessions_;
  const SettingsStore& settings_;
  std::once_flag urlOnce_;
  std::once_flag bagOnce_;
  std::shared_ptr<URLSession> url_;
  std::shared_ptr<URLSession> bag_;
};

}  // namespace zelkord
