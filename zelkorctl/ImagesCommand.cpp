#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <map>
#include <optional>

#include "corezelkor/client/EndpointClient.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/ImageDescriptors.h"
#include "zelkorctl/ImageFiles.h"
#include "zelkorctl/InlineImage.h"
#include "zelkorctl/Printable.h"
#include "zelkorctl/QueryOutput.h"
#include "zelkorctl/QueryRun.h"

namespace zelkorctl {
namespace {

using Images = std::map<std::string, Data>;

// What came of one descriptor.
struct LoadedImage {
  std::string key;  // the URL or identifier that it came under, or the wanted one
  std::optional<Data> bytes;
  ImageFiles::Saved saved;
};

// What the command line names: URLs, then identifiers.
std::vector<ImageDescriptor> namedImages(const Options& options) {
  std::vector<ImageDescriptor> images;
  for (const auto& url : options.urls) images.push_back({url, {}, {}});
  for (const auto& identifier : options.identifiers) images.push_back({{}, identifier, {}});
  return images;
}

LoadedImage imageOf(const ImageDescriptor& wanted, const Images& images) {
  for (const auto* key : {&wanted.url, &wanted.id}) {
    const auto found = key->empty() ? images.end() : images.find(*key);
    if (found != images.end()) return {*key, found->second, {}};
  }
  return {wanted.url.empty() ? wanted.id : wanted.url, std::nullopt, {}};
}

// A call may take as long as the images.
ClientOptions patientOptions(const Options& options) {
  constexpr Duration kForTheAnswer = 10s;
  auto result = clientOptions(options);
  result.timeout = std::max(result.timeout, options.deadline + kForTheAnswer);
  return result;
}

// Loads, saves and shows.
class ImagesRun {
 public:
  explicit ImagesRun(const Invocation& invocation)
      : invocation_(invocation), client_(patientOptions(invocation.options)) {}

  int run() {
    auto wanted = namedImages(invocation_.options);
    if (!invocation_.options.arguments.empty()) {
      const auto searched = _search();
      if (!searched.answer.reply) {
        showOutcome(invocation_, searched);
        return searched.answer.error ? statusOf(searched) : kErrorReply;
      }
      for (auto& image : imagesIn(searched.answer.reply->data.view()))
        wanted.push_back(std::move(image));
    }
    return _load(std::move(wanted));
  }

 private:
  Outcome _search() {
    QueryRun run(client_, invocation_.options);
    return run.ask({QueryKind::Search, joinedWords(invocation_.options.arguments), {}});
  }

  int _load(std::vector<ImageDescriptor> wanted) {
    const auto start = std::chrono::steady_clock::now();
    const auto future = EndpointClient(client_).loadImages(wanted, invocation_.options.deadline);
    const auto& result = future.get();
    milliseconds_ =
        std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
    if (!result.value) return reportError(invocation_, result.error.value_or(Error{}));
    std::vector<LoadedImage> loaded;
    for (const auto& image : wanted) loaded.push_back(imageOf(image, *result.value));
    _save(loaded);
    _show(loaded);
    return _statusOfImages(loaded);
  }

  void _save(std::vector<LoadedImage>& images) const {
    if (invocation_.options.folder.empty()) return;
    ImageFiles files(invocation_.options.folder);
    for (auto& image : images) {
      if (image.bytes) image.saved = files.save(image.key, image.bytes->view());
    }
  }

  void _show(const std::vector<LoadedImage>& images) const {
    if (invocation_.options.json) {
      invocation_.surroundings.out << json::serialize(_toJson(images)) << '\n';
      return;
    }
    for (const auto& image : images) _showOne(image);
    const auto came = std::count_if(images.begin(), images.end(),
                                    [](const auto& image) { return image.bytes.has_value(); });
    invocation_.surroundings.out << fmt::format("{} of {} in {:.1f} ms\n", came, images.size(),
                                                milliseconds_);
  }

  void _showOne(const LoadedImage& image) const {
    auto& out = invocation_.surroundings.out;
    out << "  " << printable(image.key) << "  " << _remark(image) << '\n';
    if (!image.bytes || !invocation_.surroundings.showsImages) return;
    if (imageType(image.bytes->view()).extension != ".png") return;
    out << "  " << inlineImage(image.bytes->view()) << '\n';
  }

  static std::string _remark(const LoadedImage& image) {
    if (!image.bytes) return "did not come";
    auto text =
        fmt::format("{} bytes, {}", image.bytes->size(), imageType(image.bytes->view()).name);
    if (image.saved.error) return text + ", not saved: " + errorText(*image.saved.error);
    return image.saved.path.empty() ? text : text + ", saved as " + printable(image.saved.path);
  }

  json::object _toJson(const std::vector<LoadedImage>& images) const {
    json::array loaded;
    json::array missing;
    for (const auto& image : images) {
      if (image.bytes) {
        loaded.push_back(_toJson(image));
      } else {
        missing.push_back(json::string(image.key));
      }
    }
    return {{"milliseconds", milliseconds_},
            {"images", std::move(loaded)},
            {"missing", std::move(missing)}};
  }

  static json::object _toJson(const LoadedImage& image) {
    json::object object{{"key", image.key},
                        {"bytes", image.bytes->size()},
                        {"type", imageType(image.bytes->view()).name}};
    if (image.saved.error) {
      object["error"] = errorJson(*image.saved.error);
    } else if (!image.saved.path.empty()) {
      object["file"] = image.saved.path;
    }
    return object;
  }

  static int _statusOfImages(const std::vector<LoadedImage>& images) {
    for (const auto& image : images) {
      if (!image.bytes || image.saved.error) return kErrorReply;
    }
    return kAnswered;
  }

  const Invocation& invocation_;
  Client client_;
  double milliseconds_ = 0;
};

}  // namespace

int runImages(const Invocation& invocation) { return ImagesRun(invocation).run(); }

}  // namespace zelkorctl
