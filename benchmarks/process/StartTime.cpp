#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/Samples.h"

namespace zelkord::bench {
namespace {

constexpr double kLimit = 60;  // milliseconds

}  // namespace

void measureStart(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  ProcessBed bed(sandbox);
  bed.timeDaemonStart();  // makes the files of a first start
  Samples ours, floor;
  for (int i = 0; i < plan.starts; ++i) {
    ours.add(bed.timeDaemonStart() / 1000);
    floor.add(bed.timeFloorStart() / 1000);
  }
  report.add({.name = "start to name on the bus p50",
              .unit = "ms",
              .ours = ours.median(),
              .floor = Row::Other{"echo", floor.median(), ours.median() / floor.median()},
              .target = Row::Target::Excess,
              .limit = kLimit});
}

}  // namespace zelkord::bench
