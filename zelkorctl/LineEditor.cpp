#include "zelkorctl/LineEditor.h"

#include "base/Text.h"

namespace zelkorctl {
namespace {

constexpr char kCtrlC = 0x03;
constexpr char kCtrlD = 0x04;
constexpr char kBackspace = 0x08;
constexpr char kCtrlU = 0x15;
constexpr char kEscape = 0x1b;
constexpr char kDelete = 0x7f;

std::size_t lengthByLead(unsigned char lead) {
  if (lead < 0x80) return 1;
  if (lead >= 0xF0) return 4;
  return lead >= 0xE0 ? 3 : 2;
}

bool continues(char byte) { return (static_cast<unsigned char>(byte) & 0xC0) == 0x80; }

}  // namespace

LineEditor::Event LineEditor::take(char byte) {
  if (escape_ == Escape::Begun) {
    escape_ = byte == '[' || byte == 'O' ? Escape::Sequence : Escape::None;
    return Event::None;
  }
  if (escape_ == Escape::Sequence) {
    if (byte >= '@' && byte <= '~') escape_ = Escape::None;
    return Event::None;
  }
  const auto value = static_cast<unsigned char>(byte);
  return value < 0x20 || byte == kDelete ? _control(byte) : _add(byte);
}

LineEditor::Event LineEditor::_control(char byte) {
  partial_.clear();
  switch (byte) {
    case kCtrlC:
    case kCtrlD:
      return Event::Ended;
    case kBackspace:
    case kDelete:
      return _erase();
    case kEscape:
      escape_ = Escape::Begun;
      return Event::None;
    case '\r':
    case '\n':
      text_.clear();
      return Event::Submitted;
    case kCtrlU:
      text_.clear();
      return Event::Changed;
    default:
      return Event::None;
  }
}

LineEditor::Event LineEditor::_add(char byte) {
  if (!continues(byte)) partial_.clear();
  partial_ += byte;
  const auto lead = static_cast<unsigned char>(partial_.front());
  if (partial_.size() < lengthByLead(lead)) return Event::None;
  const bool valid = zelkor::isValidUtf8(partial_);
  if (valid) text_ += partial_;
  partial_.clear();
  return valid ? Event::Changed : Event::None;
}

LineEditor::Event LineEditor::_erase() {
  if (text_.empty()) return Event::None;
  while (text_.size() > 1 && continues(text_.back())) text_.pop_back();
  text_.pop_back();
  return Event::Changed;
}

}  // namespace zelkorctl
