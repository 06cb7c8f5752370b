#include "benchmarks/process/Report.h"

#include <fmt/core.h>

#include <cstdio>

namespace zelkord::bench {
namespace {

std::string fieldsOf(const std::optional<Row::Other>& other) {
  return other ? fmt::format("{}\t{:.6g}\t{:.6g}", other->name, other->value, other->ratio)
               : "-\t-\t-";
}

std::string targetOf(const Row& row) {
  switch (row.target) {
    case Row::Target::None:
      return "-";
    case Row::Target::Value:
      return fmt::format("<= {:g}", row.limit);
    case Row::Target::Ratio:
      return fmt::format("<= {:g} x", row.limit);
    case Row::Target::Excess:
      return fmt::format("<= floor + {:g}", row.limit);
  }
  return "-";
}

}  // namespace

void Report::add(const Row& row) {
  fmt::print("{}\t{}\t{}\t{:.6g}\t{}\t{}\t{}\n", row.name, row.figure.empty() ? "-" : row.figure,
             row.unit, row.ours, targetOf(row), fieldsOf(row.floor), fieldsOf(row.second));
  std::fflush(stdout);
}

void Report::bound(const std::string& name, double ours, double limit, const std::string& unit) {
  add({.name = name, .unit = unit, .ours = ours, .target = Row::Target::Value, .limit = limit});
}

void Report::plain(const std::string& name, double ours, const std::string& unit) {
  add({.name = name, .unit = unit, .ours = ours});
}

}  // namespace zelkord::bench
