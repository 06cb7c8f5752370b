#include "sandbox/Sandbox.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "sandbox/data/IndexBuilder.h"
#include "sandbox/http/Certificate.h"

namespace sandbox {

Outcome<std::unique_ptr<Sandbox>> Sandbox::start(const Setup& setup) {
  std::error_code error;
  std::filesystem::create_directories(setup.state, error);
  if (error) return Failure{setup.state.string() + ": " + error.message()};
  std::unique_ptr<Sandbox> sandbox(new Sandbox());
  if (auto failure = sandbox->_lockState(setup.state)) return *failure;
  if (auto failure = sandbox->_openStores(setup)) return *failure;
  if (auto failure = sandbox->_serve(setup)) return *failure;
  return sandbox;
}

Sandbox::~Sandbox() {
  server_.reset();
  service_.reset();
  if (lock_ >= 0) ::close(lock_);
}

std::optional<Failure> Sandbox::_lockState(const std::filesystem::path& folder) {
  lock_ = ::open((folder / "lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  if (lock_ < 0) return Failure{"cannot write in " + folder.string()};
  if (::flock(lock_, LOCK_EX | LOCK_NB) != 0)
    return Failure{folder.string() + " is in use by another sandbox"};
  return std::nullopt;
}

std::optional<Failure> Sandbox::_openStores(const Setup& setup) {
  for (const auto& package : setup.sources.missingPackages()) {
    notes_.push_back("no data of the package " + package + ": going on without it");
  }
  const auto built = IndexBuilder::ensure(setup.sources, setup.state / "index.db");
  if (!built) return built.failure();
  if (*built) notes_.push_back("built the index");
  index_ = std::make_unique<SuggestionIndexPool>(setup.state / "index.db");
  if (auto failure = index_->open()) return failure;
  auto log = RequestLog::open(setup.state / "requests.db");
  if (!log) return log.failure();
  log_ = std::move(*log);
  auto uploads = UploadStore::open(setup.state / "uploads.db");
  if (!uploads) return uploads.failure();
  uploads_ = std::move(*uploads);
  return std::nullopt;
}

std::optional<Failure> Sandbox::_serve(const Setup& setup) {
  const auto certificate = ensureCertificate(setup.state);
  if (!certificate) return certificate.failure();
  auto server = Server::listen(*certificate, setup.port);
  if (!server) return server.failure();
  server_ = std::move(*server);
  url_ = "https://localhost:" + std::to_string(server_->port());
  service_ =
      std::make_unique<Service>(Service::Stores{*index_, *log_, *uploads_}, setup.sources, url_);
  server_->start(
      [service = service_.get()](Request request) { return service->handle(std::move(request)); },
      setup.threads);
  return std::nullopt;
}

}  // namespace sandbox
