#include "benchmarks/process/Plan.h"

#include <stdexcept>

namespace zelkord::bench {
namespace {

void makeQuick(Plan& plan) {
  plan.rounds = 5;
  plan.roundTrips = 400;
  plan.fetches = 50;
  plan.starts = 5;
  plan.settling = std::chrono::seconds(18);
  plan.idle = std::chrono::seconds(10);
  plan.typing = std::chrono::seconds(5);
}

}  // namespace

Plan parsePlan(const std::vector<std::string>& arguments) {
  Plan plan;
  for (std::size_t i = 0; i < arguments.size(); ++i) {
    const bool hasValue = i + 1 < arguments.size();
    if (arguments[i] == "--quick") {
      makeQuick(plan);
    } else if (arguments[i] == "--idle" && hasValue) {
      plan.idle = std::chrono::seconds(std::stoi(arguments[++i]));
    } else if (arguments[i] == "--only" && hasValue) {
      plan.only = arguments[++i];
    } else {
      throw std::runtime_error(
          "usage: zelkord_process_bench [--quick] [--idle SECONDS]\n"
          "         [--only roundtrip|hit|states|images|network|start|idle|burst|typing]");
    }
  }
  return plan;
}

}  // namespace zelkord::bench
