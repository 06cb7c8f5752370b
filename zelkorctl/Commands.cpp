#include "zelkorctl/Commands.h"

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Printable.h"

namespace zelkorctl {

int reportError(const Invocation& invocation, const Error& error) {
  if (invocation.options.json) {
    invocation.surroundings.out << json::serialize(json::object{{"error", errorJson(error)}})
                                << '\n';
  } else {
    invocation.surroundings.err << "zelkorctl: " << errorText(error) << '\n';
  }
  return isClientError(error, ClientErrorCode::NotReachable) ? kNotReachable : kErrorReply;
}

ClientOptions unconfigured(const Options& options) {
  auto result = clientOptions(options);
  result.configuration = {};
  return result;
}

void printPair(const Invocation& invocation, std::string_view name, std::string_view value,
               std::size_t nameColumns) {
  const auto shown = printable(name);
  const auto columns = nameColumns == 0 ? displayWidth(shown) : nameColumns;
  invocation.surroundings.out << padded(shown, columns) << "  " << printable(value) << '\n';
}

}  // namespace zelkorctl
