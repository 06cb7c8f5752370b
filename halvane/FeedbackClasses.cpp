#include "halvane/FeedbackClasses.h"

#include <algorithm>
#include <vector>

#include "halvane/DaemonFeedback.h"
#include "halvane/ModelFeedback.h"

namespace zelkor {
namespace {

template <typename T, FeedbackFamily Family>
std::unique_ptr<HVFeedback> make() {
  auto feedback = std::make_unique<T>();
  feedback->family = Family;
  return feedback;
}

bool hasName(const std::vector<FeedbackClass>& classes, std::string_view name) {
  return std::any_of(classes.begin(), classes.end(),
                     [name](const auto& known) { return known.name == name; });
}

// Adds a kind's classes; a message class that is there already stays as it is.
template <typename T>
void addClasses(std::vector<FeedbackClass>& classes) {
  using enum FeedbackFamily;
  constexpr auto kKind = T::kDescription;
  if (!kKind.isMessageOnly()) {
    classes.push_back({kKind.name, Model, kKind.origin(), &make<T, Model>});
  }
  const auto message = kMessageNameOf<T>.view();
  if (hasName(classes, message)) return;
  classes.push_back({message, Message, kKind.origin(), &make<T, Message>});
}

template <typename... Kinds>
std::vector<FeedbackClass> classesOf(FeedbackList<Kinds...>) {
  std::vector<FeedbackClass> classes;
  (addClasses<Kinds>(classes), ...);
  std::sort(classes.begin(), classes.end(),
            [](const auto& a, const auto& b) { return a.name < b.name; });
  return classes;
}

}  // namespace

std::span<const FeedbackClass> feedbackClasses() {
  static const auto classes = classesOf(FeedbackKinds());
  return classes;
}

const FeedbackClass* feedbackClassNamed(std::string_view name) {
  const auto classes = feedbackClasses();
  const auto found =
      std::lower_bound(classes.begin(), classes.end(), name,
                       [](const auto& known, std::string_view text) { return known.name < text; });
  return found != classes.end() && found->name == name ? &*found : nullptr;
}

std::unique_ptr<HVFeedback> readFeedback(const FeedbackClass& feedbackClass,
                                         std::string_view message, RecordFault& fault) {
  auto feedback = feedbackClass.make();
  RecordReader reader(message);
  const bool good = feedback->read(reader);
  fault = reader.fault();
  return good ? std::move(feedback) : nullptr;
}

}  // namespace zelkor
