#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "base/Mutex.h"
#include "platform/api/LocationService.h"

namespace zelkord {

// A location service whose fixes, failures and authorisations the test delivers. Managers get them
// on their queue; fixes and failures only while they update.
//
// Threading: any thread.
class FakeLocation final : public LocationService {
 public:
  FakeLocation();
  ~FakeLocation() override;

  bool isEnabledSystemWide() const override;
  LocationAuthorization authorization(const std::string& bundlePath) const override;
  void setAuthorization(const std::string& bundlePath, LocationAuthorization status) override;
  std::unique_ptr<LocationManager> makeManager(const std::string& bundlePath,
                                               const LocationOptions& options,
                                               std::weak_ptr<LocationDelegate> delegate,
                                               WorkQueue& queue) override;

  void setEnabledSystemWide(bool enabled);
  void deliver(std::vector<LocationFix> fixes);
  void fail(Error error);
  // Sets the authorisation of a bundle and tells every manager, changed or not.
  void changeAuthorization(const std::string& bundlePath, LocationAuthorization status);

  int managers() const;                          // that exist
  int updating() const;                          // of them
  int starts() const;                            // calls of startUpdating so far
  std::vector<LocationOptions> options() const;  // of every manager so far

  struct State;

 private:
  void _tell(bool onlyUpdating, std::function<void(LocationDelegate&)> event);

  const std::shared_ptr<State> state_;
};

}  // namespace zelkord
