#include <stdexcept>

#include "benchmarks/process/BusClient.h"
#include "benchmarks/process/BusConnecting.h"
#include "benchmarks/process/Comparison.h"
#include "benchmarks/process/CurlImages.h"
#include "benchmarks/process/ImageCall.h"
#include "benchmarks/process/Measurements.h"
#include "benchmarks/process/ProcessBed.h"
#include "benchmarks/process/Waiting.h"

namespace zelkord::bench {
namespace {

constexpr std::size_t kImages = 50;
constexpr std::size_t kImageSize = 20'480;
constexpr Comparison::Limits kLimits{.median = 1.3};
constexpr double kCachedLimit = 2;  // milliseconds

void expectAll(std::size_t size) {
  if (size != kImages * kImageSize)
    throw std::runtime_error("images of " + std::to_string(size) + " bytes in all");
}

// Images that nobody has asked for yet; the service answers without looking at the item.
class FreshImages {
 public:
  explicit FreshImages(std::string base) : base_(std::move(base)) {}
  std::vector<std::string> next() {
    std::vector<std::string> urls;
    for (std::size_t i = 0; i < kImages; ++i) urls.push_back(base_ + std::to_string(++count_));
    return urls;
  }

 private:
  const std::string base_;
  std::size_t count_ = 0;
};

void makeImagesOfSize(const SandboxProcess& sandbox) {
  sandbox.control("misbehave",
                  R"({"path": "/image/*", "count": 0, "headers": {"Content-Type": "image/png",)"
                  R"( "Cache-Control": "public, max-age=86400"}, "body": ")" +
                      std::string(kImageSize, 'i') + "\"}");
}

void measureCached(const Plan& plan, sd_bus* endpoint, const std::vector<std::string>& urls,
                   Report& report) {
  expectAll(loadImages(endpoint, urls));
  Samples times;
  for (int i = 0; i < plan.fetches; ++i) {
    const auto start = Clock::now();
    expectAll(loadImages(endpoint, urls));
    times.add(microsecondsSince(start) / 1000);
  }
  report.bound("50 images of 20 KiB from the cache p50", times.median(), kCachedLimit, "ms");
}

}  // namespace

void measureImages(const Plan& plan, const SandboxProcess& sandbox, Report& report) {
  makeImagesOfSize(sandbox);
  ProcessBed bed(sandbox);
  const auto process = bed.daemon().pid();
  auto client = BusClient::ofPeer(bed.daemonAddress());
  client.firstSearch({.queryString = "france"});  // its answer names the host of the images
  const auto endpoint = connectToPeer(client.endpointAddress());
  CurlImages bare(sandbox.certificate(), kImages);
  FreshImages images(sandbox.url() + "/image/flags/fr.png?n=");
  const auto ours = Contender::process(
      "ours", process, [&] { expectAll(loadImages(endpoint.get(), images.next())); });
  const auto floor =
      Contender::thisThread("50 handles", [&] { expectAll(bare.fetch(images.next())); });
  Comparison::run({plan.rounds, plan.fetches / 15}, ours, floor)
      .report(report, "50 images of 20 KiB", kLimits);
  measureCached(plan, endpoint.get(), images.next(), report);
  sandbox.control("behave");
}

}  // namespace zelkord::bench
