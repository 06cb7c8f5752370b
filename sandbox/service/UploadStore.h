#pragma once

#include <boost/json/array.hpp>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <mutex>

#include "sandbox/core/Outcome.h"
#include "sandbox/core/Sqlite.h"
#include "sandbox/http/Message.h"
#include "sandbox/service/UploadCheck.h"

namespace sandbox {

// Every upload that arrived, good or bad, in the table `uploads` of a SQLite file that others may
// read meanwhile.
//
// Threading: any thread; one at a time gets in. Errors: an upload that cannot be stored is answered
// with a 500.
class UploadStore final {
 public:
  static Outcome<std::unique_ptr<UploadStore>> open(const std::filesystem::path& path);

  // Checks the upload, stores it, and answers 200, or 400 with the problem.
  Reply accept(const Request& request);

  // Objects with "id", "time", "path", "items", "user_agent", "transfer_identifier", "digest",
  // "packed_size", "size", "accepted", "problem", "repeat" (of an accepted upload with this
  // transfer identifier) and "content" (JSON).
  boost::json::array list(std::int64_t since);

  void clear();

 private:
  explicit UploadStore(Database database);
  bool _store(const Request& request, const UploadVerdict& verdict);

  std::mutex mutex_;
  Database database_;
  Statement insert_;
  Statement known_;
  Statement select_;
};

}  // namespace sandbox
