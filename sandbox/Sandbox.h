#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "sandbox/core/Outcome.h"
#include "sandbox/data/DataSources.h"
#include "sandbox/http/Server.h"
#include "sandbox/search/SuggestionIndex.h"
#include "sandbox/service/RequestLog.h"
#include "sandbox/service/Service.h"
#include "sandbox/service/UploadStore.h"

namespace sandbox {

// The whole program: state directory, stores, service and server.
//
// The state directory holds cert.pem, key.pem, index.db, requests.db, uploads.db and lock, and
// belongs to one program at a time. Threading: one thread owns it. Ownership: the destructor ends
// the service and writes what is queued.
class Sandbox final {
 public:
  struct Setup {
    std::filesystem::path state;
    DataSources sources;
    std::uint16_t port = 0;
    unsigned threads = 2;
  };

  // Returns once it is serving.
  static Outcome<std::unique_ptr<Sandbox>> start(const Setup& setup);
  ~Sandbox();

  const std::string& url() const { return url_; }
  // For people: what was built, what is missing.
  const std::vector<std::string>& notes() const { return notes_; }

 private:
  Sandbox() = default;
  std::optional<Failure> _lockState(const std::filesystem::path& folder);
  std::optional<Failure> _openStores(const Setup& setup);
  std::optional<Failure> _serve(const Setup& setup);

  int lock_ = -1;
  std::string url_;
  std::vector<std::string> notes_;
  std::unique_ptr<SuggestionIndexPool> index_;
  std::unique_ptr<RequestLog> log_;
  std::unique_ptr<UploadStore> uploads_;
  std::unique_ptr<Service> service_;
  std::unique_ptr<Server> server_;
};

}  // namespace sandbox
