#include "platform/linux/locale/HostLocaleWatcher.h"

#include <systemd/sd-bus.h>

#include <set>
#include <utility>

namespace zelkord {
namespace {

constexpr Duration kHostLocaleSettleTime = 100ms;

const std::set<std::string> kLocaleVariables = {"LC_ALL", "LC_MESSAGES", "LANG", "LANGUAGE"};

std::vector<std::string> readTextArrayProperty(sd_bus_message* message) {
  std::vector<std::string> texts;
  if (::sd_bus_message_enter_container(message, 'v', "as") < 0 ||
      ::sd_bus_message_enter_container(message, 'a', "s") < 0) {
    return texts;
  }
  for (const char* text = nullptr; ::sd_bus_message_read(message, "s", &text) > 0;) {
    texts.emplace_back(text);
  }
  return texts;
}

}  // namespace

struct HostLocaleWatcher::BusCallbacks {
  static int timeZoneChanged(sd_bus_message*, void* self, sd_bus_error*) {
    static_cast<HostLocaleWatcher*>(self)->_noteChange();
    return 0;
  }
  static int localeChanged(sd_bus_message* signal, void* self, sd_bus_error*) {
    static_cast<HostLocaleWatcher*>(self)->_readLocale(::sd_bus_message_get_bus(signal));
    return 0;
  }
  static int localeRead(sd_bus_message* reply, void* self, sd_bus_error*) {
    if (::sd_bus_message_is_method_error(reply, nullptr)) return 0;
    static_cast<HostLocaleWatcher*>(self)->_localeArrived(
        localeVariables(readTextArrayProperty(reply)));
    return 0;
  }
};

std::map<std::string, std::string> localeVariables(const std::vector<std::string>& assignments) {
  std::map<std::string, std::string> variables;
  for (const auto& assignment : assignments) {
    const auto equals = assignment.find('=');
    if (equals == std::string::npos) continue;
    const auto name = assignment.substr(0, equals);
    if (kLocaleVariables.contains(name)) variables[name] = assignment.substr(equals + 1);
  }
  return variables;
}

HostLocaleWatcher::HostLocaleWatcher(HostLocaleSources sources,
                                     std::function<void(HostLocale)> changed, WorkQueues& queues,
                                     Loop& host, PathWatcher& watcher, LogSink& log)
    : sources_(std::move(sources)),
      changed_(std::move(changed)),
      log_(log, ""),
      queue_(queues.makeSerialQueue("com.quenta.zelkord.hostlocale")),
      bus_(host, {[this](sd_bus* bus) { _connected(bus); },
                  [this](const std::string& problem) { _away(problem); }}) {
  for (const auto& path : {sources_.localtimePath, sources_.timezonePath}) {
    watches_.push_back(watcher.watch(path, [this] { _noteChange(); }));
  }
  bus_.start();
}

HostLocaleWatcher::~HostLocaleWatcher() {
  watches_.clear();
  bus_.stop();
  queue_->sync([this] {
    queue_->assertCurrent();
    timer_.reset();
  });
}

void HostLocaleWatcher::_connected(sd_bus* bus) {
  const auto match = [this, bus](const char* path, sd_bus_message_handler_t handler) {
    ::sd_bus_match_signal_async(bus, nullptr, nullptr, path, "org.freedesktop.DBus.Properties",
                                "PropertiesChanged", handler, nullptr, this);
  };
  match("/org/freedesktop/locale1", BusCallbacks::localeChanged);
  match("/org/freedesktop/timedate1", BusCallbacks::timeZoneChanged);
  // At first the environment counts, whatever locale1 would say; what it says while the bus is away
  // is not heard.
  if (std::exchange(wasConnected_, true)) _readLocale(bus);
}

void HostLocaleWatcher::_away(const std::string& problem) {
  if (std::exchange(complained_, true)) return;
  log_.notice("no system bus: changes of the system's locale are not seen ({})", problem);
}

void HostLocaleWatcher::_readLocale(sd_bus* bus) {
  ::sd_bus_call_method_async(bus, nullptr, "org.freedesktop.locale1", "/org/freedesktop/locale1",
                             "org.freedesktop.DBus.Properties", "Get", BusCallbacks::localeRead,
                             this, "ss", "org.freedesktop.locale1", "Locale");
}

void HostLocaleWatcher::_localeArrived(std::map<std::string, std::string> variables) {
  queue_->async([this, variables = std::move(variables)] {
    queue_->assertCurrent();
    variables_ = variables;
  });
  _noteChange();
}

void HostLocaleWatcher::_noteChange() {
  queue_->async([this] {
    queue_->assertCurrent();
    if (timer_) return;
    timer_ = queue_->after(
        kHostLocaleSettleTime, [this] { _reread(); }, TimeBase::Real);
  });
}

void HostLocaleWatcher::_reread() {
  queue_->assertCurrent();
  timer_.reset();
  auto sources = sources_;
  if (!variables_.empty()) {
    sources.environment = [this, variables = variables_](const std::string& name) {
      if (!kLocaleVariables.contains(name)) return sources_.environment(name);
      const auto found = variables.find(name);
      return found == variables.end() ? std::string() : found->second;
    };
  }
  changed_(readHostLocale(sources));
}

}  // namespace zelkord
