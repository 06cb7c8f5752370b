#include "platform/linux/process/TraceMarker.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

namespace zelkord {

TraceMarker::TraceMarker(Logger log, std::string path)
    : log_(std::move(log)), path_(std::move(path)) {}

TraceMarker::~TraceMarker() {
  if (file_ >= 0) ::close(file_);
}

void TraceMarker::_open() {
  file_ = ::open(path_.c_str(), O_WRONLY | O_CLOEXEC);
  if (file_ < 0) log_.notice("no kernel trace: {}: {}", path_, std::strerror(errno));
}

void TraceMarker::emit(std::uint32_t code) {
  std::call_once(opened_, [this] { _open(); });
  if (file_ < 0) return;
  const std::string line = "zelkord: " + std::to_string(code) + "\n";
  [[maybe_unused]] const auto written = ::write(file_, line.data(), line.size());
}

}  // namespace zelkord
