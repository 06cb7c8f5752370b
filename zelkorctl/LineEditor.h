#pragma once

#include <string>
#include <string_view>

namespace zelkorctl {

// The line that somebody types, byte by byte as a raw terminal or a pipe gives them.
//
// Understands backspace, Ctrl-U, Enter, Ctrl-C and Ctrl-D; skips escape sequences and other
// control characters. Threading: one thread.
class LineEditor {
 public:
  enum class Event {
    None,       // nothing to see yet, such as half a character
    Changed,    // another text
    Submitted,  // Enter: the line is empty now
    Ended,
  };

  Event take(char byte);
  const std::string& text() const { return text_; }

 private:
  enum class Escape { None, Begun, Sequence };

  Event _control(char byte);
  Event _add(char byte);
  Event _erase();

  std::string text_;
  std::string partial_;  // the bytes of a character that is not complete
  Escape escape_ = Escape::None;
};

}  // namespace zelkorctl
