#include "platform/linux/property_list/BinaryPropertyListCheck.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <vector>

namespace zelkord {
namespace {

// The file: "bplist00", the objects, a table of their offsets, and a trailer of 32 bytes.
constexpr std::string_view kPlistMagic = "bplist00";
constexpr std::size_t kPlistTrailer = 32;

std::uint64_t bigEndian(std::string_view bytes) {
  std::uint64_t value = 0;
  for (const unsigned char c : bytes) value = value << 8 | c;
  return value;
}

// The decoder ends a text at its first zero character, and the process when the text had another
// length.
bool isAsciiText(std::optional<std::string_view> text) {
  return text && std::ranges::all_of(*text, [](char c) { return static_cast<signed char>(c) > 0; });
}

bool isUtf16Text(std::optional<std::string_view> text) {
  bool inPair = false;
  for (std::size_t at = 0; text && at < text->size(); at += 2) {
    const auto unit = bigEndian(text->substr(at, 2));
    const bool ends = unit >= 0xDC00 && unit <= 0xDFFF;
    if (unit == 0 || ends != inPair) return false;
    inPair = unit >= 0xD800 && unit <= 0xDBFF;
  }
  return text && !inPair;
}

// Walks the objects without recursion, each once, children first.
class PlistWalk {
 public:
  PlistWalk(std::string_view bytes, const PropertyListLimits& limits)
      : bytes_(bytes), limits_(limits) {}

  std::string run() {
    if (!_readTrailer()) return "broken trailer";
    stack_.push_back({root_, {}, 0});
    while (problem_.empty() && !stack_.empty()) _visit();
    return problem_;
  }

 private:
  enum class State : std::uint8_t { New, Open, Done };
  struct Object {
    State state = State::New;
    std::size_t depth = 0;   // of the tree below it, itself included
    std::size_t values = 0;  // in that tree
    std::size_t bytes = 0;   // of the texts and data in it
  };
  struct Place {
    std::size_t object;
    std::vector<std::size_t> children;
    std::size_t next;
  };

  bool _readTrailer() {
    if (!bytes_.starts_with(kPlistMagic) || bytes_.size() < kPlistMagic.size() + kPlistTrailer) {
      return false;
    }
    const auto trailer = bytes_.substr(bytes_.size() - kPlistTrailer);
    offsetSize_ = static_cast<unsigned char>(trailer[6]);
    referenceSize_ = static_cast<unsigned char>(trailer[7]);
    const auto count = bigEndian(trailer.substr(8, 8));
    root_ = bigEndian(trailer.substr(16, 8));
    table_ = bigEndian(trailer.substr(24, 8));
    end_ = bytes_.size() - kPlistTrailer;
    if (offsetSize_ < 1 || offsetSize_ > 8 || referenceSize_ < 1 || referenceSize_ > 8)
      return false;
    if (table_ < kPlistMagic.size() || table_ > end_) return false;
    if (count == 0 || count > (end_ - table_) / offsetSize_ || root_ >= count) return false;
    objects_.resize(count);
    return true;
  }

  void _fail(const char* problem) { problem_ = problem; }

  void _visit() {
    auto& place = stack_.back();
    auto& object = objects_[place.object];
    if (object.state == State::New) {
      object.state = State::Open;
      if (!_readObject(place)) return _fail("an object is broken or lies outside the file");
      if (stack_.size() > limits_.depth) return _fail("too deep");
    }
    if (place.next < place.children.size()) return _descend(place);
    _finish(place);
    stack_.pop_back();
  }

  void _descend(Place& place) {
    const auto child = place.children[place.next++];
    const auto state = objects_[child].state;
    if (state == State::Open) return _fail("an object contains itself");
    if (state == State::New) stack_.push_back({child, {}, 0});
  }

  void _finish(const Place& place) {
    auto& object = objects_[place.object];
    object.state = State::Done;
    object.depth = 1;
    object.values = 1;
    for (const auto child : place.children) {
      object.depth = std::max(object.depth, objects_[child].depth + 1);
      object.values += objects_[child].values;
      object.bytes += objects_[child].bytes;
      if (object.values > limits_.values) return _fail("too many values");
      if (object.bytes > limits_.bytes) return _fail("too many bytes");
    }
    if (object.depth > limits_.depth) _fail("too deep");
  }

  // The size that an object's head gives: in the marker's low half, or in an integer object behind
  // it.
  std::optional<std::uint64_t> _readSize(std::size_t& at, unsigned low) const {
    if (low != 0xF) return low;
    if (at >= table_) return std::nullopt;
    const auto marker = static_cast<unsigned char>(bytes_[at++]);
    const std::size_t width = std::size_t{1} << (marker & 0xF);
    if (marker >> 4 != 1 || width > 8 || width > table_ - at) return std::nullopt;
    at += width;
    return bigEndian(bytes_.substr(at - width, width));
  }

  bool _readObject(Place& place) {
    const auto offset = bigEndian(bytes_.substr(table_ + place.object * offsetSize_, offsetSize_));
    if (offset < kPlistMagic.size() || offset >= table_) return false;
    std::size_t at = offset + 1;
    const auto marker = static_cast<unsigned char>(bytes_[offset]);
    const unsigned low = marker & 0xF;
    auto& bytes = objects_[place.object].bytes;
    switch (marker >> 4) {
      case 0x0:
        return true;
      case 0x1:
      case 0x2:
        return low <= 4 && std::size_t{1} << low <= table_ - at;
      case 0x3:
        return 8 <= table_ - at;
      case 0x4:
        return _readBytes(at, low, 1, bytes).has_value();
      case 0x5:
        return isAsciiText(_readBytes(at, low, 1, bytes));
      case 0x6:
        return isUtf16Text(_readBytes(at, low, 2, bytes));
      case 0x8:
        return low + 1 <= table_ - at;
      case 0xA:
      case 0xC:
        return _readReferences(at, low, 1, place.children);
      case 0xD:
        return _readReferences(at, low, 2, place.children);
      default:
        return false;
    }
  }

  // What is in a text or data object, whose size is noted.
  std::optional<std::string_view> _readBytes(std::size_t at, unsigned low, std::size_t unit,
                                             std::size_t& bytes) const {
    const auto size = _readSize(at, low);
    if (!size || *size > (table_ - at) / unit) return std::nullopt;
    bytes = *size * unit;
    return bytes_.substr(at, bytes);
  }

  bool _readReferences(std::size_t at, unsigned low, std::size_t each,
                       std::vector<std::size_t>& children) const {
    const auto size = _readSize(at, low);
    if (!size || *size > (table_ - at) / (referenceSize_ * each)) return false;
    for (std::uint64_t i = 0; i < *size * each; ++i, at += referenceSize_) {
      children.push_back(bigEndian(bytes_.substr(at, referenceSize_)));
      if (children.back() >= objects_.size()) return false;
    }
    return true;
  }

  const std::string_view bytes_;
  const PropertyListLimits limits_;
  std::size_t offsetSize_ = 0;
  std::size_t referenceSize_ = 0;
  std::size_t root_ = 0;
  std::size_t table_ = 0;  // where the offset table begins
  std::size_t end_ = 0;    // where it ends at most
  std::vector<Object> objects_;
  std::vector<Place> stack_;
  std::string problem_;
};

}  // namespace

std::string checkBinaryPropertyList(std::string_view bytes, const PropertyListLimits& limits) {
  return PlistWalk(bytes, limits).run();
}

}  // namespace zelkord
