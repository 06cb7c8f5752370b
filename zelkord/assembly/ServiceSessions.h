#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <string>

#include "platform/api/SettingsStore.h"
#include "platform/api/URLSession.h"

namespace zelkord {

// The header with the user identifier of a request.
inline constexpr const char* kUserGuidHeader = "X-Quenta-UserGuid";

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
  // Nothing of what the sessions made under a user identifier is used any more.
  void endIdentity(const std::string& identity);

 private:
  URLSessions& sessions_;
  const SettingsStore& settings_;
  std::once_flag urlOnce_;
  std::once_flag bagOnce_;
  std::shared_ptr<URLSession> url_;
  std::shared_ptr<URLSession> bag_;
  // Null until they are made.
  std::atomic<URLSession*> madeURL_ = nullptr;
  std::atomic<URLSession*> madeBag_ = nullptr;
};

}  // namespace zelkord
