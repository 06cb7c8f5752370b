#include "tests/soak/TypingClient.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <utility>

#include "corezelkor/client/internal/Wire.h"

namespace zelkord::soak {
namespace {

constexpr std::size_t kMostAtOnce = 8;
constexpr std::uint64_t kPatience = 120'000'000;  // microseconds

zelkor::MessagePointer newCall(sd_bus* bus, const char* member) {
  sd_bus_message* call = nullptr;
  sd_bus_message_new_method_call(bus, &call, nullptr, "/com/quenta/zelkord",
                                 "com.quenta.zelkord.Daemon1", member);
  return zelkor::MessagePointer(call);
}

bool isKnownError(const zelkor::Error& error) {
  if (error.domain == "ZLKErrorDomain") return error.code == 1 || error.code == 500;
  constexpr std::array<std::int64_t, 9> kTransport = {-1,    -1001, -1003, -1004, -1005,
                                                      -1007, -1022, -1103, -1200};
  return error.domain == "URLErrorDomain" &&
         std::ranges::find(kTransport, error.code) != kTransport.end();
}

double millisecondsSince(SteadyClock::time_point begin) {
  return std::chrono::duration<double, std::milli>(SteadyClock::now() - begin).count();
}

std::shared_ptr<zelkor::ZLKRequest> anyOther(unsigned choice) {
  switch (choice % 4) {
    case 0:
      return std::make_shared<zelkor::ZLKZeroKeywordRequest>();
    case 1:
      return std::make_shared<zelkor::ZLKLookupRequest>();
    case 2:
      return std::make_shared<zelkor::ZLKMoreResultsRequest>();
    default:
      return std::make_shared<zelkor::ZLKCardRequest>();
  }
}

}  // namespace

struct TypingClient::Question {
  TypingClient& client;
  std::int64_t queryId;  // 0: the configuration
  bool isSearch;
  SteadyClock::time_point asked = SteadyClock::now();
  zelkor::SlotPointer slot = nullptr;
};

TypingClient::TypingClient(Habits habits, const Words& words, Tally& tally, unsigned seed)
    : habits_(std::move(habits)), words_(words), tally_(tally), random_(seed) {
  _connect();
}

TypingClient::~TypingClient() { disconnect(); }

void TypingClient::_connect() {
  sd_bus* bus = nullptr;
  sd_bus_new(&bus);
  bus_.reset(bus);
  sd_bus_set_address(bus, habits_.address.c_str());
  sd_bus_set_method_call_timeout(bus, kPatience);
  if (const int result = sd_bus_start(bus); result < 0) return _cannotConnect(-result);
  turnedAway_.reset();
  // Answers that somebody waits for never get as far as a filter.
  sd_bus_add_filter(
      bus, nullptr,
      [](sd_bus_message* message, void* self, sd_bus_error*) {
        std::uint64_t cookie = 0;
        if (sd_bus_message_get_reply_cookie(message, &cookie) >= 0) {
          static_cast<TypingClient*>(self)->_fault("answered twice");
        }
        return 0;
      },
      this);
  auto call = newCall(bus, "Configure");
  zelkor::MessageWriter writer(call.get());
  zelkor::writeConfiguration(writer, {habits_.identifier, "Soak/1.0"});
  queryId_ = 0;
  _send(std::move(call), false);
}

// A place may be missing for a moment.
void TypingClient::_cannotConnect(int problem) {
  disconnect();
  if (!turnedAway_) turnedAway_ = SteadyClock::now();
  if (problem == EAGAIN && SteadyClock::now() - *turnedAway_ < std::chrono::seconds(1)) return;
  _fault(std::string("the daemon cannot be reached: ") + std::strerror(problem));
}

void TypingClient::disconnect() {
  tally_.disconnected +=
      std::ranges::count_if(pending_, [](const auto& question) { return question->queryId != 0; });
  pending_.clear();
  bus_.reset();
}

void TypingClient::act() {
  nextAct_ = SteadyClock::now() + habits_.pause * (random_() % 2001) / 1000;
  if (pending_.size() >= kMostAtOnce) return;
  if (!bus_) return _connect();
  if (typed_ == word_.size()) {
    if (!word_.empty()) _finishWord();
    word_ = words_.any(random_);
    typed_ = 0;
  } else {
    ++typed_;
    _search();
  }
}

void TypingClient::_search() {
  ++tally_.keystrokes;
  _ask(std::make_shared<zelkor::ZLKSearchRequest>());
}

void TypingClient::_finishWord() {
  const auto choice = static_cast<unsigned>(random_() % 100);
  if (choice < 2) return disconnect();
  if (choice < 40) _ask(anyOther(choice));
}

void TypingClient::_ask(std::shared_ptr<zelkor::ZLKRequest> request) {
  request->queryId = ++queryId_;
  request->queryString = word_.substr(0, typed_);
  auto call = newCall(bus_.get(), "Request");
  zelkor::MessageWriter writer(call.get());
  zelkor::writeRequest(writer, *request);
  ++tally_.asked;
  _send(std::move(call), std::dynamic_pointer_cast<zelkor::ZLKSearchRequest>(request) != nullptr);
}

void TypingClient::_send(zelkor::MessagePointer call, bool isSearch) {
  auto question = std::make_unique<Question>(Question{*this, queryId_, isSearch});
  sd_bus_slot* slot = nullptr;
  const int result = sd_bus_call_async(
      bus_.get(), &slot, call.get(),
      [](sd_bus_message* reply, void* asked, sd_bus_error*) {
        auto& ended = *static_cast<Question*>(asked);
        ended.client._ended(ended, reply);
        return 1;
      },
      question.get(), 0);
  if (result < 0) return _fault("a question could not be sent");
  question->slot.reset(slot);
  pending_.insert(std::move(question));
}

void TypingClient::_ended(Question& question, sd_bus_message* reply) {
  const auto found = std::ranges::find(pending_, &question, &std::unique_ptr<Question>::get);
  const auto owned = std::move(pending_.extract(found).value());
  if (sd_bus_message_is_method_error(reply, nullptr) > 0) {
    _fault(std::string("a D-Bus error: ") + sd_bus_message_get_error(reply)->name);
    if (owned->queryId != 0) ++tally_.errors["D-Bus"];
  } else if (owned->queryId != 0) {
    _judge(*owned, reply);
  }
}

void TypingClient::_judge(const Question& question, sd_bus_message* reply) {
  zelkor::MessageReader reader(reply);
  const auto answer = zelkor::readAnswer(reader);
  if (!reader.ok()) _fault("an answer of another form");
  if (answer.queryId != question.queryId) _fault("an answer to another query");
  if (answer.error) {
    if (habits_.strict || !isKnownError(*answer.error)) {
      _fault("an error for no known reason: " + answer.error->description());
    }
    ++tally_.errors[answer.error->domain + " " + std::to_string(answer.error->code)];
  } else if (answer.reply) {
    ++tally_.answered;
    if (question.isSearch) tally_.milliseconds.push_back(millisecondsSince(question.asked));
  } else if (!question.isSearch) {
    ++tally_.withoutAnswer;
  } else {
    if (question.queryId >= queryId_) _fault("the newest query was answered with nothing");
    ++tally_.stale;
  }
}

pollfd TypingClient::waiting() const {
  if (!bus_) return {-1, 0, 0};
  const int events = sd_bus_get_events(bus_.get());
  return {sd_bus_get_fd(bus_.get()), static_cast<short>(std::max(events, 0)), 0};
}

void TypingClient::process() {
  int result = bus_ ? 1 : 0;
  while (result > 0) result = sd_bus_process(bus_.get(), nullptr);
  if (result >= 0) return;
  _fault("the daemon closed the connection");
  disconnect();
}

}  // namespace zelkord::soak
