#include "zelkorctl/ContainerFile.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <limits>
#include <optional>

#include "base/Text.h"
#include "corezelkor/Constants.h"

namespace zelkorctl {
namespace {

constexpr std::string_view kNamePrefix = "session.";
// Far beyond the limit that the daemon keeps to.
constexpr std::uint64_t kLargestFile = 256 * 1024 * 1024;

const char* textOf(RecordFault fault) {
  switch (fault) {
    case RecordFault::UnknownValue:
      return "has a value that stands in no table";
    case RecordFault::TooManyItems:
      return "has too many items";
    default:
      return "does not decode";
  }
}

// Walks the records of a file: eight bytes of length, little-endian, then so many of payload.
class Frames {
 public:
  explicit Frames(std::string_view bytes) : bytes_(bytes) {}

  bool atEnd() const { return position_ == bytes_.size(); }
  // Where the last payload began.
  std::size_t payloadPosition() const { return payload_; }

  // None when the record is cut or its length is impossible; `fault` then says so.
  std::optional<std::string_view> next(ContainerFault& fault) {
    const auto left = bytes_.size() - position_;
    if (left < sizeof(std::uint64_t)) return _fail(fault, "is cut inside a length");
    std::uint64_t length = 0;
    for (std::size_t i = sizeof length; i > 0; --i) {
      length = length << 8 | static_cast<unsigned char>(bytes_[position_ + i - 1]);
    }
    if (length == 0) return _fail(fault, "has a length of 0");
    if (length > left - sizeof length) return _fail(fault, "is longer than the file");
    payload_ = position_ + sizeof length;
    position_ = payload_ + static_cast<std::size_t>(length);
    return bytes_.substr(payload_, static_cast<std::size_t>(length));
  }

 private:
  std::nullopt_t _fail(ContainerFault& fault, const char* what) const {
    fault.text = "the record at byte " + std::to_string(position_) + " " + what;
    return std::nullopt;
  }

  const std::string_view bytes_;
  std::size_t position_ = 0;
  std::size_t payload_ = 0;
};

// The payload's class and message, of a record that decodes.
CZFeedbackPayload payloadOf(std::string_view record) {
  struct Envelope {
    std::optional<CZFeedbackPayload> payload;
    static constexpr auto fields() { return std::tuple{stored(1, "payload", &Envelope::payload)}; }
  };
  Envelope envelope;
  RecordReader(record).read(envelope);
  return envelope.payload.value_or(CZFeedbackPayload());
}

ContainerFault undecodable(const Frames& frames, RecordFault fault) {
  return {"the record at byte " + std::to_string(frames.payloadPosition()) + " " + textOf(fault)};
}

std::optional<ContainerFault> readRecords(Frames& frames, ContainerFile& file) {
  ContainerFault fault;
  while (!frames.atEnd()) {
    const auto bytes = frames.next(fault);
    if (!bytes) return fault;
    RecordFault reason{};
    auto record = readStoredFeedback(*bytes, reason);
    if (!record) return undecodable(frames, reason);
    const auto payload = payloadOf(*bytes);
    file.records.push_back(
        {std::string(payload.feedbackClass), std::string(payload.feedback), *std::move(record)});
  }
  return std::nullopt;
}

}  // namespace

std::variant<ContainerFile, ContainerFault> parseContainer(std::string_view bytes) {
  if (bytes.empty()) return ContainerFault{"the file is empty"};
  ContainerFile file;
  file.size = bytes.size();
  Frames frames(bytes);
  ContainerFault fault;
  const auto version = frames.next(fault);
  if (!version) return fault;
  if (!isValidUtf8(*version) || version->find("Zelkord/") != 0) {
    return ContainerFault{"the file begins with no version"};
  }
  file.version = *version;
  if (frames.atEnd()) return ContainerFault{"the file has no session header"};
  const auto header = frames.next(fault);
  if (!header) return fault;
  RecordReader reader(*header);
  if (!reader.read(file.header)) return undecodable(frames, reader.fault());
  if (auto damage = readRecords(frames, file)) return *damage;
  return file;
}

std::variant<ContainerFile, ContainerFault> readContainer(const std::string& path) {
  std::error_code failure;
  if (!std::filesystem::is_regular_file(path, failure)) {
    return ContainerFault{failure ? failure.message() : "not a file"};
  }
  const auto size = std::filesystem::file_size(path, failure);
  if (failure) return ContainerFault{failure.message()};
  if (size > kLargestFile) return ContainerFault{"the file is too large"};
  std::ifstream stream(path, std::ios::binary);
  std::string bytes(static_cast<std::size_t>(size), '\0');
  stream.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  if (!stream && !stream.eof()) return ContainerFault{"the file cannot be read"};
  bytes.resize(static_cast<std::size_t>(stream.gcount()));
  return parseContainer(bytes);
}

std::vector<std::uint32_t> containerNumbers(const std::string& folder) {
  std::vector<std::uint32_t> numbers;
  std::error_code failure;
  for (const auto& entry : std::filesystem::directory_iterator(folder, failure)) {
    const auto name = entry.path().filename().string();
    if (!name.starts_with(kNamePrefix)) continue;
    const auto* begin = name.data() + kNamePrefix.size();
    const auto* end = name.data() + name.size();
    std::uint32_t number = 0;
    const auto [stop, code] = std::from_chars(begin, end, number);
    const bool isOurs = code == std::errc() && stop == end && begin != end &&
                        number <= static_cast<std::uint32_t>(std::numeric_limits<int>::max());
    if (isOurs) numbers.push_back(number);
  }
  std::sort(numbers.begin(), numbers.end());
  return numbers;
}

std::string cachesFolder() {
  const char* caches = std::getenv("XDG_CACHE_HOME");
  const char* home = std::getenv("HOME");
  const auto base = caches && caches[0] == '/'
                        ? std::string(caches)
                        : std::string(home && home[0] == '/' ? home : "") + "/.cache";
  return base + "/" + std::string(kServiceName);
}

std::string containerPath(std::uint32_t number) {
  return cachesFolder() + "/" + std::string(kNamePrefix) + std::to_string(number);
}

}  // namespace zelkorctl
