#pragma once

#include <boost/json/array.hpp>
#include <condition_variable>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "sandbox/core/Outcome.h"
#include "sandbox/core/Sqlite.h"
#include "sandbox/http/Message.h"

namespace sandbox {

double secondsSince1970();

// [[name, value], ...] in order; the value of an item without "=" is null.
std::string itemsAsJson(const std::vector<QueryItem>& items);

// What the log keeps of one request.
struct LoggedRequest {
  double time = 0;  // seconds since 1970, at arrival
  std::string method;
  std::string path;
  std::vector<QueryItem> items;
  std::string target;
  Headers headers;
  std::size_t bodySize = 0;
  unsigned status = 0;  // 0: nothing was answered
  std::uint64_t connection = 0;
  bool tlsReused = false;
  std::int64_t microseconds = 0;  // from the parsed request to the answer ready to send
};

// Which requests to read.
struct LogQuery {
  std::int64_t since = 0;  // only later ones
  std::string path;        // only this path; empty for all
  std::int64_t limit = 1000;
};

// The table `requests` of a SQLite file (write-ahead log, so that others can read while it grows).
//
// Requests are queued and written in batches by a thread of its own, within 50 ms.
// Threading: any thread. Ownership: the destructor writes what is queued. Errors: a batch that
// cannot be written is reported once on standard error and dropped.
class RequestLog final {
 public:
  static Outcome<std::unique_ptr<RequestLog>> open(const std::filesystem::path& path);
  ~RequestLog();

  void record(LoggedRequest request);

  // Returns when all that was recorded before is in the file.
  void flush();

  // Objects with the table's columns; "items" and "headers" as arrays. Flushes first.
  boost::json::array read(const LogQuery& query);

  // Forgets all requests; numbers go on.
  void clear();

 private:
  explicit RequestLog(Database database);

  void _run();
  void _write(const std::vector<LoggedRequest>& batch);
  void _insert(const LoggedRequest& request);

  // Of the writing thread, or of whoever holds `databaseMutex_`.
  std::mutex databaseMutex_;
  Database database_;
  Statement insert_;
  Statement select_;
  bool reported_ = false;

  std::mutex mutex_;
  std::condition_variable wake_;
  std::condition_variable written_;
  std::vector<LoggedRequest> queue_;
  std::uint64_t recordedCount_ = 0;
  std::uint64_t writtenCount_ = 0;
  bool urgent_ = false;
  bool stopping_ = false;

  std::thread thread_;
};

}  // namespace sandbox
