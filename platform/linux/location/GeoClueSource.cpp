#include "platform/linux/location/GeoClueSource.h"

#include <systemd/sd-bus.h>

#include <cerrno>
#include <cmath>
#include <cstring>
#include <map>
#include <optional>

namespace zelkord {
namespace {

constexpr const char* kGeoClue = "org.freedesktop.GeoClue2";
constexpr const char* kGeoClueClient = "org.freedesktop.GeoClue2.Client";
constexpr const char* kGeoClueLocation = "org.freedesktop.GeoClue2.Location";
constexpr const char* kGeoClueOwnerChanged =
    "type='signal',sender='org.freedesktop.DBus',path='/org/freedesktop/DBus',"
    "interface='org.freedesktop.DBus',member='NameOwnerChanged',arg0='org.freedesktop.GeoClue2'";
constexpr const char* kBusProperties = "org.freedesktop.DBus.Properties";

// The doubles of a dictionary of properties; other members are passed over.
std::map<std::string, double> readDoubles(sd_bus_message* message) {
  std::map<std::string, double> values;
  if (::sd_bus_message_enter_container(message, 'a', "{sv}") < 0) return values;
  while (::sd_bus_message_enter_container(message, 'e', "sv") > 0) {
    const char* name = nullptr;
    const char* contents = nullptr;
    ::sd_bus_message_read(message, "s", &name);
    ::sd_bus_message_peek_type(message, nullptr, &contents);
    double value = 0;
    if (name && contents && std::strcmp(contents, "d") == 0) {
      ::sd_bus_message_read(message, "v", "d", &value);
      values[name] = value;
    } else {
      ::sd_bus_message_skip(message, "v");
    }
    ::sd_bus_message_exit_container(message);
  }
  return values;
}

std::optional<LocationFix> fixOf(const std::map<std::string, double>& values) {
  const auto get = [&](const char* name) {
    const auto found = values.find(name);
    return found == values.end() ? NAN : found->second;
  };
  LocationFix fix;
  fix.latitude = get("Latitude");
  fix.longitude = get("Longitude");
  fix.horizontalAccuracy = get("Accuracy");
  const bool sound = std::abs(fix.latitude) <= 90 && std::abs(fix.longitude) <= 180 &&
                     fix.horizontalAccuracy >= 0 && std::isfinite(fix.horizontalAccuracy);
  if (!sound) return std::nullopt;
  fix.type = locationTypeOfAccuracy(fix.horizontalAccuracy);
  return fix;
}

}  // namespace

struct GeoClueSource::Callbacks {
  static int client(sd_bus_message* reply, void* self, sd_bus_error*) {
    static_cast<GeoClueSource*>(self)->_gotClient(reply);
    return 0;
  }
  static int done(sd_bus_message* reply, void* self, sd_bus_error*) {
    static_cast<GeoClueSource*>(self)->_failed(reply);
    return 0;
  }
  static int updated(sd_bus_message* signal, void* self, sd_bus_error*) {
    static_cast<GeoClueSource*>(self)->_locationUpdated(signal);
    return 0;
  }
  static int location(sd_bus_message* reply, void* self, sd_bus_error*) {
    static_cast<GeoClueSource*>(self)->_gotLocation(reply);
    return 0;
  }
  static int owner(sd_bus_message* signal, void* self, sd_bus_error*) {
    static_cast<GeoClueSource*>(self)->_ownerChanged(signal);
    return 0;
  }
};

int locationTypeOfAccuracy(double metres) { return metres <= 100 ? 1 : metres <= 1000 ? 4 : 6; }

unsigned geoClueAccuracyLevel(double metres) {
  return metres <= 100 ? 8 : metres <= 1000 ? 6 : metres <= 5000 ? 5 : 4;
}

std::unique_ptr<LocationSource> GeoClueSource::make(
    const LocationOptions& options, LocationSourceEvents events, const Clock& clock,
    std::function<void(const std::string&)> missing) {
  std::string problem;
  auto bus = openSystemBus(&problem);
  if (!bus) {
    missing(problem);
    return nullptr;
  }
  std::unique_ptr<GeoClueSource> source(
      new GeoClueSource(std::move(bus), options, std::move(events), clock, std::move(missing)));
  source->_begin();
  return source;
}

GeoClueSource::GeoClueSource(BusConnection bus, const LocationOptions& options,
                             LocationSourceEvents events, const Clock& clock,
                             std::function<void(const std::string&)> missing)
    : options_(options),
      events_(std::move(events)),
      clock_(clock),
      missing_(std::move(missing)),
      thread_(std::move(bus)) {}

// GeoClue forgets the client with its connection.
GeoClueSource::~GeoClueSource() = default;

void GeoClueSource::_begin() {
  ::sd_bus_add_match_async(thread_.bus(), nullptr, kGeoClueOwnerChanged, Callbacks::owner, nullptr,
                           this);
  ::sd_bus_call_method_async(thread_.bus(), nullptr, kGeoClue, "/org/freedesktop/GeoClue2/Manager",
                             "org.freedesktop.GeoClue2.Manager", "GetClient", Callbacks::client,
                             this, "");
  thread_.start([this] { _endMissing("the system bus has gone"); });
}

bool GeoClueSource::_failed(sd_bus_message* reply) {
  const auto* error = ::sd_bus_message_get_error(reply);
  if (!error) return false;
  const std::string name = error->name ? error->name : "";
  const std::string text = error->message ? error->message : name;
  if (name == "org.freedesktop.DBus.Error.AccessDenied") {
    events_.failure(posixError(EACCES));
    events_.ended();
  } else {
    _endMissing(text);
  }
  return true;
}

void GeoClueSource::_endMissing(const std::string& problem) {
  missing_(problem);
  events_.ended();
}

// Our client went with its owner.
void GeoClueSource::_ownerChanged(sd_bus_message* signal) {
  const char* name = nullptr;
  const char* before = nullptr;
  if (::sd_bus_message_read(signal, "ss", &name, &before) >= 0 && *before) {
    _endMissing("GeoClue has left the bus");
  }
}

void GeoClueSource::_gotClient(sd_bus_message* reply) {
  const char* path = nullptr;
  if (_failed(reply) || ::sd_bus_message_read(reply, "o", &path) < 0) return;
  client_ = path;
  auto* bus = thread_.bus();
  // In this order on one connection: GeoClue sees the settings before the start.
  ::sd_bus_match_signal_async(bus, nullptr, kGeoClue, client_.c_str(), kGeoClueClient,
                              "LocationUpdated", Callbacks::updated, nullptr, this);
  ::sd_bus_call_method_async(bus, nullptr, kGeoClue, client_.c_str(), kBusProperties, "Set",
                             Callbacks::done, this, "ssv", kGeoClueClient, "DesktopId", "s",
                             "com.quenta.zelkord");
  ::sd_bus_call_method_async(bus, nullptr, kGeoClue, client_.c_str(), kBusProperties, "Set",
                             Callbacks::done, this, "ssv", kGeoClueClient, "RequestedAccuracyLevel",
                             "u", geoClueAccuracyLevel(options_.desiredAccuracy));
  ::sd_bus_call_method_async(bus, nullptr, kGeoClue, client_.c_str(), kGeoClueClient, "Start",
                             Callbacks::done, this, "");
}

void GeoClueSource::_locationUpdated(sd_bus_message* signal) {
  const char* before = nullptr;
  const char* now = nullptr;
  if (::sd_bus_message_read(signal, "oo", &before, &now) < 0 || std::strcmp(now, "/") == 0) return;
  ::sd_bus_call_method_async(thread_.bus(), nullptr, kGeoClue, now, kBusProperties, "GetAll",
                             Callbacks::location, this, "s", kGeoClueLocation);
}

void GeoClueSource::_gotLocation(sd_bus_message* reply) {
  // A location that has been replaced meanwhile is gone; the signal for the new one is on its way.
  if (::sd_bus_message_is_method_error(reply, nullptr)) return;
  auto fix = fixOf(readDoubles(reply));
  if (!fix) return;
  fix->time = clock_.now();
  events_.fix(*fix);
}

}  // namespace zelkord
