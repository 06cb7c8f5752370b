#pragma once

#include <filesystem>
#include <memory>
#include <string>

#include "benchmarks/process/ChildProcess.h"

namespace zelkord::bench {

// The local suggestion service, on a free port of the loopback. Its index stays in the build
// directory for the next run.
class SandboxProcess {
 public:
  // Returns when it serves.
  SandboxProcess();

  const std::string& url() const { return url_; }
  std::string bagUrl() const { return url_ + "/bag?key=harbor4817"; }
  std::filesystem::path certificate() const { return folder_ / "cert.pem"; }
  // POST /control/ACTION.
  void control(const std::string& action, const std::string& json = "{}") const;

 private:
  const std::filesystem::path folder_{ZK_SANDBOX_STATE};
  std::unique_ptr<ChildProcess> process_;
  std::string url_;
};

}  // namespace zelkord::bench
