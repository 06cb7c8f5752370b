#include <csignal>
#include <cstdio>
#include <functional>
#include <thread>

#include "sandbox/Background.h"
#include "sandbox/Options.h"
#include "sandbox/Sandbox.h"
#include "sandbox/core/Files.h"

namespace {

// Blocked here and in every thread made later, so that only `waitForEnd` sees them.
sigset_t blockEndSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
  return signals;
}

void waitForEnd(const sigset_t& signals) {
  int signal = 0;
  sigwait(&signals, &signal);
}

int fail(const std::string& reason, int status) {
  std::fprintf(stderr, "zelkor-sandbox: %s\n", reason.c_str());
  return status;
}

// `started` is called once the service can be asked.
int serve(const sandbox::Options& options, const std::function<void()>& started) {
  const sigset_t signals = blockEndSignals();
  const unsigned threads =
      options.threads > 0 ? options.threads : std::max(2U, std::thread::hardware_concurrency());
  auto service = sandbox::Sandbox::start(
      {options.state, sandbox::DataSources(options.dataRoot), options.port, threads});
  if (!service) return fail(service.reason(), 1);
  for (const auto& note : (*service)->notes())
    std::fprintf(stderr, "zelkor-sandbox: %s\n", note.c_str());
  const std::string& url = (*service)->url();
  if (!options.portFile.empty() &&
      !sandbox::writeFileAtomically(options.portFile, url + "\n", 0644)) {
    return fail("cannot write " + options.portFile.string(), 1);
  }
  if (!options.quiet) std::printf("%s\n", url.c_str());
  std::fflush(stdout);
  started();
  waitForEnd(signals);
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  const auto options =
      sandbox::parseOptions({argv + 1, static_cast<std::size_t>(argc > 0 ? argc - 1 : 0)});
  if (!options) return fail(options.reason() + "\n" + sandbox::usage(), 2);
  if (options->help) {
    std::printf("%s", sandbox::usage().c_str());
    return 0;
  }
  if (options->version) {
    std::printf("%s", sandbox::version().c_str());
    return 0;
  }
  if (!options->background) return serve(*options, [] {});
  auto background = sandbox::Background::begin();
  if (!background) return fail(background.reason(), 1);
  return serve(*options, [&background] { background->ready(); });
}
