#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "base/Json.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {

// What is shown of an answer.
struct Shown {
  std::size_t limit = 0;        // lines in all
  std::size_t width = 0;        // columns of each
  std::string_view typed = {};  // of the sets, those that fit this are shown
};

// The best results of an answer, one line each: title, type and description under each other. What
// is not a list of result sets is said in one line. Nothing in the lines can steer a terminal.
std::vector<std::string> resultLines(const ClientAnswer& answer, const Shown& shown);

// The cards of a service response: titles, and the facts as labels and values; each at most `width`
// columns wide. What is not a list of cards is said in one line, as above.
std::vector<std::string> cardLines(std::string_view data, std::size_t width);

// The query, what became of it, where the answer is from and how long it took; when it failed for
// want of a bag, a second line says why there is none.
std::vector<std::string> outcomeLines(const Outcome& outcome, std::size_t width);

// For a verbose reply: the request that went out and the response's head.
std::vector<std::string> exchangeLines(const ZLKReply& reply);

// Everything about an outcome. The service's response is embedded as JSON when it is JSON, and of
// a search's the result sets that are for the text stand beside it; the HTTP exchange is only there
// when asked for.
enum class Exchange { LeftOut, Told };
json::object outcomeJson(const Outcome& outcome, Exchange exchange);

json::value errorJson(const Error& error);
// "reason (domain code)", printable.
std::string errorText(const Error& error);

}  // namespace zelkorctl
