#include "sandbox/service/Service.h"

#include <chrono>

#include "sandbox/core/Gzip.h"

namespace sandbox {

namespace {

constexpr std::string_view kRequestKey = "harbor4817";
constexpr std::size_t kSmallestGzip = 1024;

bool needsNoKey(const std::string& path) { return path == "/warm" || path.starts_with("/image/"); }

bool isUploadPath(const std::string& path) {
  return path == "/feedback" || path == "/crowdsourcing";
}

bool isResultPath(const std::string& path) {
  return path == "/search" || path == "/more" || path == "/related" || path == "/card";
}

bool isReadMethod(const Request& request) {
  return request.method == "GET" || request.method == "HEAD";
}

Reply methodNotAllowed(const char* allowed) {
  Reply reply = Reply::error(405, "method not allowed");
  reply.headers.emplace_back("Allow", allowed);
  return reply;
}

// A coding that is refused with q=0 is rare enough to be treated as wanted by nobody.
bool takesGzip(const Request& request) {
  const auto accepted = request.header("Accept-Encoding");
  return accepted && accepted->find("gzip") != std::string_view::npos &&
         accepted->find("gzip;q=0") == std::string_view::npos;
}

bool isPackable(const Reply& reply) {
  return reply.mayPack && reply.delivery == Delivery::Ordinary &&
         reply.bodyText().size() >= kSmallestGzip && !findHeader(reply.headers, "Content-Encoding");
}

void pack(const Request& request, Reply& reply) {
  if (!isPackable(reply)) return;
  reply.headers.emplace_back("Vary", "Accept-Encoding");
  if (!takesGzip(request)) return;
  reply.body =
      reply.gzipBody ? reply.gzipBody : std::make_shared<const std::string>(gzip(reply.bodyText()));
  reply.headers.emplace_back("Content-Encoding", "gzip");
}

}  // namespace

Service::Service(const Stores& stores, const DataSources& sources, const std::string& baseUrl)
    : log_(stores.log),
      uploads_(stores.uploads),
      bag_(baseUrl),
      control_({bag_, misbehaviours_, embeddedImages_, log_, uploads_}),
      queries_(stores.index, baseUrl),
      images_(sources.flags()),
      resources_(baseUrl) {}

Reply Service::handle(Request request) {
  if (request.path.starts_with("/control/")) return control_.answer(request);
  const double arrival = secondsSince1970();
  const auto start = std::chrono::steady_clock::now();
  Reply reply = _respond(request);
  pack(request, reply);
  const auto elapsed = std::chrono::steady_clock::now() - start;
  _log(std::move(request), reply, arrival,
       std::chrono::duration_cast<std::chrono::microseconds>(elapsed).count());
  return reply;
}

Reply Service::_respond(const Request& request) {
  const auto misbehaviour = misbehaviours_.take(request.path);
  if (!misbehaviour) return _route(request);
  auto replacement = replacementFor(*misbehaviour);
  Reply reply = replacement ? std::move(*replacement) : _route(request);
  if (misbehaviour->kind == MisbehaviourKind::Pad) {
    reply.body = std::make_shared<const std::string>(padded(reply.bodyText(), misbehaviour->bytes));
    reply.gzipBody = nullptr;
    reply.mayPack = false;
  }
  distort(*misbehaviour, reply);
  return reply;
}

Reply Service::_route(const Request& request) {
  const std::string& path = request.path;
  if (!needsNoKey(path) && request.item("key") != kRequestKey)
    return Reply::error(403, "no valid key");
  if (isUploadPath(path))
    return request.method == "POST" ? uploads_.accept(request) : methodNotAllowed("POST");
  if (!isReadMethod(request)) return methodNotAllowed("GET, HEAD");
  return _routeRead(request);
}

Reply Service::_routeRead(const Request& request) {
  const std::string& path = request.path;
  if (isResultPath(path)) return _results(request);
  if (path == "/bag") return bag_.answer(request);
  if (path.starts_with("/image/")) return images_.answer(request);
  if (path == "/warm") return Reply::empty(204);
  if (path.starts_with("/resource/")) return resources_.answer(request);
  return Reply::error(404, "no such path");
}

Reply Service::_results(const Request& request) {
  Reply reply = request.path == "/search" ? _search(request)
                : request.path == "/card" ? queries_.card(request)
                                          : queries_.more(request);
  embeddedImages_.addTo(reply);
  return reply;
}

Reply Service::_search(const Request& request) {
  Reply reply = queries_.search(request);
  if (auto announcement = bag_.announcement()) {
    reply.headers.emplace_back("X-Quenta-ForceFetch", std::move(*announcement));
  }
  return reply;
}

void Service::_log(Request request, const Reply& reply, double arrival, std::int64_t microseconds) {
  log_.record({.time = arrival,
               .method = std::move(request.method),
               .path = std::move(request.path),
               .items = std::move(request.items),
               .target = std::move(request.target),
               .headers = std::move(request.headers),
               .bodySize = request.body.size(),
               .status = reply.status,
               .connection = request.connection,
               .tlsReused = request.tlsReused,
               .microseconds = microseconds});
}

}  // namespace sandbox
