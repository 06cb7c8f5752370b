#pragma once

#include <optional>
#include <string>
#include <utility>
#include <variant>

namespace sandbox {

// Why an operation gave nothing, for people.
struct Failure {
  std::string reason;
};

// A value, or why there is none.
template <typename T>
class Outcome {
 public:
  Outcome(T value) : state_(std::move(value)) {}            // NOLINT(google-explicit-constructor)
  Outcome(Failure failure) : state_(std::move(failure)) {}  // NOLINT(google-explicit-constructor)

  explicit operator bool() const { return std::holds_alternative<T>(state_); }
  T& operator*() & { return *std::get_if<T>(&state_); }
  T&& operator*() && { return std::move(*std::get_if<T>(&state_)); }
  const T& operator*() const& { return *std::get_if<T>(&state_); }
  T* operator->() { return std::get_if<T>(&state_); }
  const T* operator->() const { return std::get_if<T>(&state_); }

  // Requires a failure.
  const std::string& reason() const { return std::get_if<Failure>(&state_)->reason; }
  Failure failure() const { return Failure{reason()}; }

 private:
  std::variant<T, Failure> state_;
};

}  // namespace sandbox
