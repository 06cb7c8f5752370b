#pragma once

#include <memory>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <utility>

#include "base/Namespace.h"

namespace zelkord {

// A text that may be absent and that many hold at once: copies are the same text. Used like an
// optional string.
//
// Threading: a value; the text is immutable.
class SharedText final {
 public:
  SharedText() = default;
  // NOLINTBEGIN(google-explicit-constructor): it stands where an optional string stood
  SharedText(std::nullopt_t) {}
  SharedText(std::string text) : text_(std::make_shared<const std::string>(std::move(text))) {}
  SharedText(const char* text) : SharedText(std::string(text)) {}
  SharedText(std::optional<std::string> text) {
    if (text) text_ = std::make_shared<const std::string>(*std::move(text));
  }
  operator std::optional<std::string>() const {
    return text_ ? std::optional(*text_) : std::nullopt;
  }
  // NOLINTEND(google-explicit-constructor)

  explicit operator bool() const { return text_ != nullptr; }
  // These require a text.
  const std::string& operator*() const { return *text_; }
  const std::string* operator->() const { return text_.get(); }
  std::string value_or(std::string_view other) const { return text_ ? *text_ : std::string(other); }

  friend bool operator==(const SharedText& a, const SharedText& b) {
    return a.text_ == b.text_ || (a.text_ && b.text_ && *a.text_ == *b.text_);
  }
  friend bool operator==(const SharedText& a, std::string_view b) { return a && *a == b; }
  friend bool operator==(const SharedText& a, const std::optional<std::string>& b) {
    return a.text_ ? b && *a == *b : !b;
  }
  friend bool operator==(const SharedText& a, const std::string& b) { return a && *a == b; }
  friend bool operator==(const SharedText& a, const char* b) { return a && *a == b; }
  friend std::ostream& operator<<(std::ostream& out, const SharedText& text) {
    return text ? out << '"' << *text << '"' : out << "(null)";
  }

 private:
  std::shared_ptr<const std::string> text_;
};

}  // namespace zelkord
