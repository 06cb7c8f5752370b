#pragma once

#include <functional>
#include <future>

#include "benchmarks/process/Plan.h"
#include "benchmarks/process/Report.h"
#include "benchmarks/process/SandboxProcess.h"

namespace zelkord::bench {

// Each measures one promise on a bed of its own. They throw std::runtime_error when something
// broke; a figure that is worse than its target is not an error.

// A search that is too short to be sent, through both doors.
void measureRoundTrips(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// A search that the daemon's query cache answers.
void measureCacheHits(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// The same with more and more clients whose caches are full, and the memory that takes.
void measureFullCaches(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// Images from the service, and again from the daemon's cache.
void measureImages(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// A search that goes to the service, by the size of the answer.
void measureNetworkSearches(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// From the start of the process to its name on the bus.
void measureStart(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// Memory, and wake-ups of a daemon that has nothing to do. These do not depend on what else runs,
// so it is measured beside the others: the result is what is to be run at the end.
std::future<std::function<void(Report&)>> measureIdleness(const Plan& plan,
                                                          const SandboxProcess& sandbox);
// 64 clients that search while the bag does not come.
void measureBurst(const Plan& plan, const SandboxProcess& sandbox, Report& report);
// 200 clients that type.
void measureTyping(const Plan& plan, const SandboxProcess& sandbox, Report& report);

}  // namespace zelkord::bench
