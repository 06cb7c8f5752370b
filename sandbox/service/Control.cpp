#include "sandbox/service/Control.h"

#include <boost/json/object.hpp>
#include <boost/json/parse.hpp>
#include <boost/json/serialize.hpp>
#include <charconv>
#include <optional>

namespace sandbox {

namespace json = boost::json;

namespace {

std::optional<json::value> controlBody(const Request& request) {
  boost::system::error_code error;
  json::value value = json::parse(request.body, error);
  if (error || !value.is_object()) return std::nullopt;
  return value;
}

std::int64_t numberItem(const Request& request, std::string_view name, std::int64_t otherwise) {
  const std::string text = request.itemOr(name);
  std::int64_t number = otherwise;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return number;
}

Reply listReply(const char* name, json::array list) {
  const std::int64_t last =
      list.empty() ? 0 : list.back().get_object()["id"].to_number<std::int64_t>();
  return Reply::json(200, json::serialize(json::object{{"last", last}, {name, std::move(list)}}));
}

Reply doneReply() { return Reply::json(200, R"({"status":"OK"})"); }

}  // namespace

Reply Control::answer(const Request& request) {
  const std::string& path = request.path;
  const bool get = request.method == "GET";
  const bool post = request.method == "POST";
  if (path == "/control/requests" && get) return _requests(request);
  if (path == "/control/uploads" && get) return _uploads(request);
  if (path == "/control/misbehave" && post) return _misbehave(request);
  if (path == "/control/behave" && post) return _behave();
  if (path == "/control/bag" && post) return _patchBag(request);
  if (path == "/control/images" && post) return _embedImages(request);
  if (path == "/control/reset" && post) return _reset();
  return Reply::error(404, "no such control request");
}

Reply Control::_requests(const Request& request) {
  LogQuery query;
  query.since = numberItem(request, "since", 0);
  query.path = request.itemOr("path");
  query.limit = numberItem(request, "limit", query.limit);
  return listReply("requests", it_.log.read(query));
}

Reply Control::_uploads(const Request& request) {
  return listReply("uploads", it_.uploads.list(numberItem(request, "since", 0)));
}

Reply Control::_misbehave(const Request& request) {
  const auto body = controlBody(request);
  if (!body) return Reply::error(400, "the body is not a JSON object");
  auto rule = parseMisbehaviour(*body);
  if (!rule) return Reply::error(400, rule.reason());
  it_.misbehaviours.add(std::move(*rule));
  return doneReply();
}

Reply Control::_behave() {
  it_.misbehaviours.clear();
  it_.embeddedImages.clear();
  return doneReply();
}

Reply Control::_patchBag(const Request& request) {
  const auto body = controlBody(request);
  if (!body) return Reply::error(400, "the body is not a JSON object");
  it_.bag.patch(*body);
  return doneReply();
}

Reply Control::_embedImages(const Request& request) {
  const auto body = controlBody(request);
  if (!body) return Reply::error(400, "the body is not a JSON object");
  if (const auto failure = it_.embeddedImages.set(*body)) return Reply::error(400, failure->reason);
  return doneReply();
}

Reply Control::_reset() {
  it_.misbehaviours.clear();
  it_.embeddedImages.clear();
  it_.bag.reset();
  it_.log.clear();
  it_.uploads.clear();
  return doneReply();
}

}  // namespace sandbox
