#include "sandbox/service/RequestLog.h"

#include <boost/json/object.hpp>
#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>
#include <chrono>
#include <cstdio>

#include "sandbox/core/Text.h"

namespace sandbox {

namespace json = boost::json;

namespace {

// How long requests gather before a batch is written.
constexpr std::chrono::milliseconds kGathering{20};

constexpr const char* kLogTables = R"(
  PRAGMA journal_mode = WAL; PRAGMA synchronous = OFF;
  CREATE TABLE IF NOT EXISTS requests(
    id INTEGER PRIMARY KEY AUTOINCREMENT, time REAL, method TEXT, path TEXT, items TEXT, target TEXT, headers TEXT,
    body_size INTEGER, status INTEGER, connection INTEGER, tls_session_reused INTEGER, microseconds INTEGER);
  CREATE INDEX IF NOT EXISTS requests_path ON requests(path, id);
)";

std::string headersAsJson(const Headers& headers) {
  json::array array;
  for (const auto& [name, value] : headers)
    array.push_back(json::array{json::string(validUtf8(name)), json::string(validUtf8(value))});
  return json::serialize(array);
}

json::value loggedArray(std::string_view text) {
  boost::system::error_code error;
  json::value value = json::parse(text, error);
  return error ? json::value(text) : value;
}

}  // namespace

double secondsSince1970() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count();
}

std::string itemsAsJson(const std::vector<QueryItem>& items) {
  json::array array;
  for (const auto& item : items) {
    json::value value;
    if (item.value) value = json::string(validUtf8(*item.value));
    array.push_back(json::array{json::string(validUtf8(item.name)), std::move(value)});
  }
  return json::serialize(array);
}

Outcome<std::unique_ptr<RequestLog>> RequestLog::open(const std::filesystem::path& path) {
  auto database = Database::open(path, Database::Mode::Write);
  if (!database) return database.failure();
  if (!database->run(kLogTables)) return Failure{path.string() + ": " + database->error()};
  return std::unique_ptr<RequestLog>(new RequestLog(std::move(*database)));
}

RequestLog::RequestLog(Database database) : database_(std::move(database)) {
  insert_ = database_.prepare(
      "INSERT INTO requests(time, method, path, items, target, headers, body_size, status, "
      "connection, "
      "tls_session_reused, microseconds) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
  select_ = database_.prepare(
      "SELECT id, time, method, path, items, target, headers, body_size, status, connection, "
      "tls_session_reused, "
      "microseconds FROM requests WHERE id > ?1 AND (?2 = '' OR path = ?2) ORDER BY id LIMIT ?3");
  thread_ = std::thread([this] { _run(); });
}

RequestLog::~RequestLog() {
  {
    const std::lock_guard lock(mutex_);
    stopping_ = true;
  }
  wake_.notify_all();
  thread_.join();
}

void RequestLog::record(LoggedRequest request) {
  bool first = false;
  {
    const std::lock_guard lock(mutex_);
    first = queue_.empty();
    queue_.push_back(std::move(request));
    ++recordedCount_;
  }
  if (first) wake_.notify_one();
}

void RequestLog::flush() {
  std::unique_lock lock(mutex_);
  const std::uint64_t target = recordedCount_;
  if (writtenCount_ >= target) return;
  urgent_ = true;
  wake_.notify_one();
  written_.wait(lock, [&] { return writtenCount_ >= target; });
}

void RequestLog::_run() {
  std::unique_lock lock(mutex_);
  while (!stopping_ || !queue_.empty()) {
    wake_.wait(lock, [this] { return stopping_ || !queue_.empty(); });
    wake_.wait_for(lock, kGathering, [this] { return stopping_ || urgent_; });
    urgent_ = false;
    std::vector<LoggedRequest> batch;
    batch.swap(queue_);
    lock.unlock();
    _write(batch);
    lock.lock();
    writtenCount_ += batch.size();
    written_.notify_all();
  }
}

void RequestLog::_write(const std::vector<LoggedRequest>& batch) {
  if (batch.empty()) return;
  const std::lock_guard lock(databaseMutex_);
  database_.run("BEGIN");
  for (const auto& request : batch) _insert(request);
  if (database_.run("COMMIT") || reported_) return;
  reported_ = true;
  std::fprintf(stderr, "zelkor-sandbox: request log: %s\n", database_.error().c_str());
}

void RequestLog::_insert(const LoggedRequest& request) {
  insert_.bind(1, request.time)
      .bind(2, request.method)
      .bind(3, request.path)
      .bind(4, itemsAsJson(request.items));
  insert_.bind(5, request.target).bind(6, headersAsJson(request.headers));
  insert_.bind(7, static_cast<std::int64_t>(request.bodySize))
      .bind(8, std::int64_t{request.status});
  insert_.bind(9, static_cast<std::int64_t>(request.connection))
      .bind(10, std::int64_t{request.tlsReused});
  insert_.bind(11, request.microseconds).run();
}

json::array RequestLog::read(const LogQuery& query) {
  flush();
  const std::lock_guard lock(databaseMutex_);
  json::array requests;
  select_.bind(1, query.since).bind(2, query.path).bind(3, query.limit);
  while (select_.step()) {
    requests.push_back(json::object{{"id", select_.integer(0)},
                                    {"time", select_.real(1)},
                                    {"method", select_.text(2)},
                                    {"path", select_.text(3)},
                                    {"items", loggedArray(select_.text(4))},
                                    {"target", select_.text(5)},
                                    {"headers", loggedArray(select_.text(6))},
                                    {"body_size", select_.integer(7)},
                                    {"status", select_.integer(8)},
                                    {"connection", select_.integer(9)},
                                    {"tls_session_reused", select_.integer(10) != 0},
                                    {"microseconds", select_.integer(11)}});
  }
  return requests;
}

void RequestLog::clear() {
  flush();
  const std::lock_guard lock(databaseMutex_);
  database_.run("DELETE FROM requests");
}

}  // namespace sandbox
