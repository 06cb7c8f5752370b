#pragma once

#include <sys/types.h>

#include <functional>
#include <string>
#include <utility>

#include "benchmarks/process/ProcessFacts.h"

namespace zelkord::bench {

// One of those that are compared: what is timed, and what whoever does the work has used so far.
struct Contender {
  // The name stands in the table.
  static Contender process(std::string name, pid_t process, std::function<void()> work) {
    return {std::move(name), std::move(work), [process] { return usageOf(process); }};
  }
  static Contender thisThread(std::string name, std::function<void()> work) {
    return {std::move(name), std::move(work), &usageOfThisThread};
  }

  std::string name;
  std::function<void()> work;
  std::function<Usage()> usage;
};

}  // namespace zelkord::bench
