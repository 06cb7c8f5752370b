#include "benchmarks/process/Report.h"

#include <fmt/core.h>

#include <cstdio>

namespace zelkord::bench {
namespace {

std::string shown(double value, const std::string& unit) {
  return fmt::format("{:.4g} {}", value, unit);
}

void line(const std::string& name, const std::string& ours, const std::string& floor,
          const std::string& ratio, const std::string& target, const std::string& verdict) {
  fmt::print("{}\t{}\t{}\t{}\t{}\t{}\n", name, ours, floor, ratio, target, verdict);
  std::fflush(stdout);
}

std::string verdictOf(bool holds) { return holds ? "ok" : "over"; }

}  // namespace

void Report::ratio(const std::string& name, double ours, double floor, double ratio, double limit,
                   const std::string& unit) {
  line(name, shown(ours, unit), shown(floor, unit), fmt::format("{:.2f}", ratio),
       limit > 0 ? fmt::format("<= {:.2f} x", limit) : "-",
       limit > 0 ? verdictOf(ratio <= limit) : "-");
}

void Report::bound(const std::string& name, double ours, double limit, const std::string& unit) {
  line(name, shown(ours, unit), "-", "-", fmt::format("<= {:g} {}", limit, unit),
       verdictOf(ours <= limit));
}

void Report::excess(const std::string& name, double ours, double floor, double limit,
                    const std::string& unit) {
  line(name, shown(ours, unit), shown(floor, unit), fmt::format("{:.2f}", ours / floor),
       fmt::format("<= floor + {:g} {}", limit, unit), verdictOf(ours - floor <= limit));
}

void Report::plain(const std::string& name, double ours, const std::string& unit) {
  line(name, shown(ours, unit), "-", "-", "-", "-");
}

}  // namespace zelkord::bench
