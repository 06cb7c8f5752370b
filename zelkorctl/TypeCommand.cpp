#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <memory>
#include <optional>
#include <thread>

#include "zelkorctl/AnswerText.h"
#include "zelkorctl/Commands.h"
#include "zelkorctl/LineEditor.h"
#include "zelkorctl/Printable.h"
#include "zelkorctl/QueryOutput.h"
#include "zelkorctl/QueryRun.h"
#include "zelkorctl/RawTerminal.h"
#include "zelkorctl/TerminalScreen.h"
#include "zelkorctl/TerminalSignals.h"

namespace zelkorctl {
namespace {

// The interactive search: keystrokes in, queries out, answers shown as they come.
//
// On a terminal the newest answer stands under the line that is typed; elsewhere every answer is
// one line of output. A signal that ends it at a terminal waits until the terminal is put back.
class TypingSession {
 public:
  explicit TypingSession(const Invocation& invocation)
      : invocation_(invocation),
        atTerminal_(invocation.surroundings.inputIsTerminal),
        client_(clientOptions(invocation.options)),
        run_(client_, invocation.options) {}

  int run() {
    {
      const RawTerminal raw(invocation_.surroundings.input);
      if (atTerminal_ && invocation_.surroundings.outputIsTerminal && !invocation_.options.json) {
        screen_.emplace(_out(), invocation_.surroundings.output);
      }
      _draw();
      bool typing = true;
      while (_mayGoOn(typing)) typing = _turn(typing);
      screen_.reset();
    }
    if (unreachable_) reportError(invocation_, *unreachable_);
    return status_;
  }

  // The signal that ended it; 0 for none.
  int endingSignal() const { return endingSignal_; }

 private:
  std::ostream& _out() const { return invocation_.surroundings.out; }

  // Who ends typing at a terminal does not wait for answers.
  bool _mayGoOn(bool typing) const {
    if (unreachable_ || endingSignal_ != 0 || !_out().good()) return false;
    return typing || (!atTerminal_ && run_.hasOutstanding());
  }

  // Waits for something and deals with it; whether there may be more keys.
  bool _turn(bool typing) {
    pollfd waiting[] = {{run_.descriptor(), POLLIN, 0},
                        {signals_ ? signals_->descriptor() : -1, POLLIN, 0},
                        {typing ? invocation_.surroundings.input : -1, POLLIN, 0}};
    ::poll(waiting, 3, -1);
    if (waiting[1].revents != 0) _takeSignals();
    for (const auto& outcome : run_.take()) _show(outcome);
    return typing && (waiting[2].revents == 0 || _takeKey());
  }

  void _takeSignals() {
    while (const auto signal = signals_->take()) {
      if (*signal != SIGWINCH) endingSignal_ = *signal;
    }
    _draw();
  }

  // False at the end of what is typed.
  bool _takeKey() {
    char byte = 0;
    const auto count = ::read(invocation_.surroundings.input, &byte, 1);
    if (count < 0 && (errno == EINTR || errno == EAGAIN)) return true;
    if (count <= 0) return false;
    switch (editor_.take(byte)) {
      case LineEditor::Event::None:
        return true;
      case LineEditor::Event::Ended:
        return false;
      case LineEditor::Event::Submitted:
        latest_.reset();
        break;
      case LineEditor::Event::Changed:
        _sendText();
        break;
    }
    _draw();
    return true;
  }

  void _sendText() {
    if (editor_.text().empty()) {
      latest_.reset();
      return;
    }
    run_.send({QueryKind::Search, editor_.text(), {}});
    if (!atTerminal_) std::this_thread::sleep_for(invocation_.options.delayPerKey);
  }

  void _show(const Outcome& outcome) {
    if (const auto& error = outcome.answer.error) {
      status_ = statusOf(outcome);
      if (status_ == kNotReachable) unreachable_ = error;
    }
    if (!screen_) {
      _print(outcome);
    } else if (outcome.kind != Outcome::Kind::Stale) {
      latest_ = outcome;
      _draw();
    }
  }

  void _print(const Outcome& outcome) const {
    showOutcome(invocation_, outcome);
    _out() << std::flush;
  }

  void _draw() {
    if (!screen_) return;
    std::vector<std::string> lines = {"> " + printable(editor_.text())};
    const auto width = screen_->size().columns - 1;
    if (latest_) {
      for (auto& line : outcomeLines(*latest_, width)) lines.push_back(std::move(line));
    }
    if (latest_ && latest_->answer.reply) {
      const Shown shown{static_cast<std::size_t>(invocation_.options.limit), width, latest_->text};
      for (auto& line : resultLines(latest_->answer, shown)) lines.push_back(std::move(line));
    }
    screen_->show(lines);
  }

  const Invocation& invocation_;
  const bool atTerminal_;
  // Before the client, whose thread leaves the signals to this one.
  const std::unique_ptr<TerminalSignals> signals_ =
      atTerminal_ ? std::make_unique<TerminalSignals>() : nullptr;
  Client client_;
  QueryRun run_;
  std::optional<TerminalScreen> screen_;
  LineEditor editor_;
  std::optional<Outcome> latest_;
  std::optional<Error> unreachable_;
  int endingSignal_ = 0;
  int status_ = kAnswered;
};

}  // namespace

int runType(const Invocation& invocation) {
  int status = kAnswered;
  int signal = 0;
  {
    TypingSession session(invocation);
    status = session.run();
    signal = session.endingSignal();
  }
  // The terminal is as it was: now it may happen.
  if (signal != 0) ::raise(signal);
  return status;
}

}  // namespace zelkorctl
