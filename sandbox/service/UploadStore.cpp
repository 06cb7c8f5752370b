#include "sandbox/service/UploadStore.h"

#include <boost/json/object.hpp>
#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>
#include <chrono>

#include "sandbox/service/RequestLog.h"

namespace sandbox {

namespace json = boost::json;

namespace {

constexpr const char* kUploadTables = R"(
  PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL;
  CREATE TABLE IF NOT EXISTS uploads(
    id INTEGER PRIMARY KEY AUTOINCREMENT, time REAL, path TEXT, items TEXT, user_agent TEXT, transfer_identifier TEXT,
    digest TEXT, packed_size INTEGER, accepted INTEGER, problem TEXT, repeat INTEGER, content TEXT);
  CREATE INDEX IF NOT EXISTS uploads_transfer ON uploads(transfer_identifier);
)";

// JSON where it is, else the text.
json::value jsonOrText(std::string_view text) {
  boost::system::error_code error;
  json::parse_options options;
  options.max_depth = 512;
  json::value value = json::parse(text, error, {}, options);
  return error ? json::value(text) : value;
}

}  // namespace

Outcome<std::unique_ptr<UploadStore>> UploadStore::open(const std::filesystem::path& path) {
  auto database = Database::open(path, Database::Mode::Write);
  if (!database) return database.failure();
  if (!database->run(kUploadTables)) return Failure{path.string() + ": " + database->error()};
  return std::unique_ptr<UploadStore>(new UploadStore(std::move(*database)));
}

UploadStore::UploadStore(Database database) : database_(std::move(database)) {
  insert_ = database_.prepare(
      "INSERT INTO uploads(time, path, items, user_agent, transfer_identifier, digest, "
      "packed_size, accepted, problem, repeat, content) "
      "VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
  known_ = database_.prepare(
      "SELECT 1 FROM uploads WHERE transfer_identifier = ? AND accepted AND path = ?");
  select_ = database_.prepare(
      "SELECT id, time, path, items, user_agent, transfer_identifier, digest, packed_size, "
      "accepted, problem, repeat, content "
      "FROM uploads WHERE id > ? ORDER BY id");
}

Reply UploadStore::accept(const Request& request) {
  const UploadVerdict verdict = checkUpload(request);
  if (!_store(request, verdict)) return Reply::error(500, "the upload could not be stored");
  if (!verdict.problem.empty()) return Reply::error(400, verdict.problem);
  return Reply::json(200, R"({"status":"OK"})");
}

bool UploadStore::_store(const Request& request, const UploadVerdict& verdict) {
  const std::lock_guard lock(mutex_);
  const std::string transfer(request.header("X-Quenta-Transfer-Identifier").value_or(""));
  known_.bind(1, transfer).bind(2, request.path);
  const bool repeat = !transfer.empty() && known_.step();
  known_.reset();
  const bool accepted = verdict.problem.empty();
  insert_.bind(1, secondsSince1970()).bind(2, request.path).bind(3, itemsAsJson(request.items));
  insert_.bind(4, request.header("User-Agent").value_or("")).bind(5, transfer);
  insert_.bind(6, request.header("X-Quenta-Digest").value_or(""));
  insert_.bind(7, static_cast<std::int64_t>(request.body.size())).bind(8, std::int64_t{accepted});
  return insert_.bind(9, verdict.problem)
      .bind(10, std::int64_t{repeat})
      .bind(11, verdict.text)
      .run();
}

json::array UploadStore::list(std::int64_t since) {
  const std::lock_guard lock(mutex_);
  json::array uploads;
  select_.bind(1, since);
  while (select_.step()) {
    uploads.push_back(json::object{{"id", select_.integer(0)},
                                   {"time", select_.real(1)},
                                   {"path", select_.text(2)},
                                   {"items", jsonOrText(select_.text(3))},
                                   {"user_agent", select_.text(4)},
                                   {"transfer_identifier", select_.text(5)},
                                   {"digest", select_.text(6)},
                                   {"packed_size", select_.integer(7)},
                                   {"accepted", select_.integer(8) != 0},
                                   {"problem", select_.text(9)},
                                   {"repeat", select_.integer(10) != 0},
                                   {"size", select_.text(11).size()},
                                   {"content", jsonOrText(select_.text(11))}});
  }
  return uploads;
}

void UploadStore::clear() {
  const std::lock_guard lock(mutex_);
  database_.run("DELETE FROM uploads");
}

}  // namespace sandbox
