#include "benchmarks/process/SandboxProcess.h"

#include <fstream>

#include "benchmarks/process/CurlClient.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {

SandboxProcess::SandboxProcess() {
  const auto portFile = folder_ / "url";
  std::filesystem::create_directories(folder_);
  std::filesystem::remove(portFile);
  process_ = std::make_unique<ChildProcess>(
      std::vector<std::string>{ZK_ZELKOR_SANDBOX_BINARY, "--state", folder_, "--port-file",
                               portFile, "--quiet"},
      ChildProcess::Environment{}, folder_ / "output");
  waitFor("the sandbox", std::chrono::seconds(120), [&] {
    if (!process_->isRunning()) throw std::runtime_error("the sandbox ended");
    return std::filesystem::exists(portFile);
  });
  std::ifstream(portFile) >> url_;
  control("reset");
}

void SandboxProcess::control(const std::string& action, const std::string& json) const {
  CurlClient(certificate()).post(url_ + "/control/" + action, json);
}

}  // namespace zelkord::bench
