#include <fmt/format.h>
#include <poll.h>
#include <unistd.h>

#include <optional>
#include <thread>

#include "corezelkor/client/ClientError.h"
#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/LineEditor.h"
#include "zelkorctl/Printable.h"
#include "zelkorctl/QueryRun.h"
#include "zelkorctl/RawTerminal.h"

namespace zelkorctl {
namespace {

// The interactive search: keystrokes in, queries out, answers shown as they come.
//
// On a terminal the newest answer stands under the line that is typed; elsewhere every answer is
// one line of output.
class TypingSession {
 public:
  explicit TypingSession(const Invocation& invocation)
      : invocation_(invocation),
        screen_(invocation.surroundings.outputIsTerminal &&
                invocation.surroundings.inputIsTerminal && !invocation.options.json),
        client_(clientOptions(invocation.options)),
        run_(client_, invocation.options) {}

  int run() {
    const RawTerminal raw(invocation_.surroundings.input);
    draw();
    bool typing = true;
    while (status_ != kNotReachable && (typing || run_.hasOutstanding())) {
      waitForEvents(typing);
      for (const auto& outcome : run_.take()) show(outcome);
      if (typing) typing = takeKey();
    }
    if (screen_) out() << "\r\033[J" << std::flush;
    return status_;
  }

 private:
  std::ostream& out() const { return invocation_.surroundings.out; }

  void waitForEvents(bool typing) {
    pollfd waiting[] = {{run_.descriptor(), POLLIN, 0},
                        {typing ? invocation_.surroundings.input : -1, POLLIN, 0}};
    ::poll(waiting, 2, -1);
    keyIsThere_ = waiting[1].revents != 0;
  }

  // False at the end of what is typed.
  bool takeKey() {
    if (!keyIsThere_) return true;
    char byte = 0;
    if (::read(invocation_.surroundings.input, &byte, 1) <= 0) return false;
    switch (editor_.take(byte)) {
      case LineEditor::Event::None:
        return true;
      case LineEditor::Event::Ended:
        return false;
      case LineEditor::Event::Submitted:
        latest_.reset();
        break;
      case LineEditor::Event::Changed:
        sendText();
        break;
    }
    draw();
    return true;
  }

  void sendText() {
    if (editor_.text().empty()) {
      latest_.reset();
      return;
    }
    run_.send({QueryKind::Search, editor_.text(), {}});
    if (!invocation_.surroundings.inputIsTerminal) {
      std::this_thread::sleep_for(invocation_.options.delayPerKey);
    }
  }

  void show(const Outcome& outcome) {
    if (outcome.answer.error) {
      const bool gone = isClientError(*outcome.answer.error, ClientErrorCode::NotReachable);
      status_ = gone ? kNotReachable : kErrorReply;
      if (gone) reportError(invocation_, *outcome.answer.error);
    }
    if (!screen_) {
      print(outcome);
    } else if (outcome.kind != Outcome::Kind::Stale) {
      latest_ = outcome;
      draw();
    }
  }

  void print(const Outcome& outcome) const {
    if (invocation_.options.json) {
      const auto exchange = invocation_.options.verbose ? Exchange::Told : Exchange::LeftOut;
      out() << json::serialize(outcomeJson(outcome, exchange)) << std::endl;
    } else {
      out() << outcomeLine(outcome, invocation_.surroundings.columns) << std::endl;
    }
  }

  // The results under the line, then the cursor back at the line's end.
  void draw() const {
    if (!screen_) return;
    const auto columns = invocation_.surroundings.columns;
    const auto prompt = fitted("> " + printable(editor_.text()), columns - 1);
    out() << "\r\033[J" << prompt;
    const auto lines = linesBelow(columns - 1);
    for (const auto& line : lines) out() << "\r\n" << line;
    if (!lines.empty()) out() << fmt::format("\033[{}A", lines.size());
    out() << fmt::format("\r\033[{}C", displayWidth(prompt)) << std::flush;
  }

  std::vector<std::string> linesBelow(std::size_t columns) const {
    if (!latest_) return {};
    auto lines = std::vector<std::string>{outcomeLine(*latest_, columns)};
    if (!latest_->answer.reply) return lines;
    const Shown shown{static_cast<std::size_t>(invocation_.options.limit), columns, latest_->text};
    const auto results = resultLines(latest_->answer.reply->data.view(), shown);
    lines.insert(lines.end(), results.begin(), results.end());
    return lines;
  }

  const Invocation& invocation_;
  const bool screen_;
  Client client_;
  QueryRun run_;
  LineEditor editor_;
  std::optional<Outcome> latest_;
  bool keyIsThere_ = false;
  int status_ = kAnswered;
};

}  // namespace

int runType(const Invocation& invocation) { return TypingSession(invocation).run(); }

}  // namespace zelkorctl
