#include "benchmarks/process/ProcessFacts.h"

#include <sys/resource.h>
#include <time.h>

#include <filesystem>
#include <fstream>
#include <system_error>

namespace zelkord::bench {
namespace {

double microsecondsOf(clockid_t clock) {
  timespec time{};
  if (::clock_gettime(clock, &time) != 0) return 0;
  return static_cast<double>(time.tv_sec) * 1e6 + static_cast<double>(time.tv_nsec) / 1e3;
}

std::filesystem::path folderOf(pid_t process) {
  return std::filesystem::path("/proc") / std::to_string(process);
}

// The value of a line "key:	value" of a status file.
std::string statusValue(const std::filesystem::path& folder, const std::string& key) {
  std::ifstream file(folder / "status");
  for (std::string word; file >> word;) {
    if (word != key + ":") continue;
    file >> word;
    return word;
  }
  return {};
}

std::int64_t statusNumber(const std::filesystem::path& folder, const std::string& key) {
  const auto text = statusValue(folder, key);
  return text.empty() ? 0 : std::stoll(text);
}

}  // namespace

double processorTimeOf(pid_t process) {
  clockid_t clock{};
  return ::clock_getcpuclockid(process, &clock) == 0 ? microsecondsOf(clock) : 0;
}

std::int64_t threadsOf(pid_t process) { return statusNumber(folderOf(process), "Threads"); }

double residentMiBOf(pid_t process) {
  return static_cast<double>(statusNumber(folderOf(process), "VmRSS")) / 1024;
}

Sleeps sleepsOf(pid_t process) {
  Sleeps sleeps;
  std::error_code problem;
  for (const auto& thread :
       std::filesystem::directory_iterator(folderOf(process) / "task", problem)) {
    const auto name = thread.path().filename().string() + " " + statusValue(thread.path(), "Name");
    sleeps[name] = statusNumber(thread.path(), "voluntary_ctxt_switches");
  }
  return sleeps;
}

Sleeps sleepsBetween(const Sleeps& before, const Sleeps& after) {
  Sleeps between;
  for (const auto& [thread, count] : after) {
    const auto known = before.find(thread);
    const auto more = known == before.end() ? count : count - known->second;
    if (more > 0) between[thread] = more;
  }
  return between;
}

std::int64_t sumOf(const Sleeps& sleeps) {
  std::int64_t sum = 0;
  for (const auto& [thread, count] : sleeps) sum += count;
  return sum;
}

Usage usageOf(pid_t process) { return {processorTimeOf(process), sleepsOf(process)}; }

Usage usageOfThisThread() {
  rusage usage{};
  ::getrusage(RUSAGE_THREAD, &usage);
  return {microsecondsOf(CLOCK_THREAD_CPUTIME_ID), {{"this thread", usage.ru_nvcsw}}};
}

}  // namespace zelkord::bench
