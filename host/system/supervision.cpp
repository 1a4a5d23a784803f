#include "host/system/supervision.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;
using Moment = Supervision::Moment;
using SteadyClock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kTick = 100ms;
constexpr std::chrono::milliseconds kUrgentTick = 1ms;
// How long a finished child may take to exit, and any child after SIGTERM.
constexpr std::chrono::milliseconds kGrace = 500ms;
// How long a child that has closed its connection may take to exit, if its deadline is not sooner. On a busy machine
// the system needs a while to end a process.
constexpr std::chrono::seconds kClosing = 5s;
// How long to wait for a killed process: one that is blocked in the kernel does not end.
constexpr std::chrono::seconds kMaxDeath = 5s;
constexpr std::size_t kMaxOutputLength = 1U << 16;

// Splits the input from a descriptor into lines. A line of more than `longest` bytes is split or, with kRefuse,
// dropped; reading then stops.
class LineReader {
 public:
  enum class LongLines { kCut, kRefuse };

  LineReader(int descriptor, std::size_t longest, LongLines longLines)
      : descriptor_(descriptor), longest_(longest), longLines_(longLines) {}

  int descriptor() const { return descriptor_; }
  // True at the end of the input.
  bool atEnd() const { return atEnd_; }
  // True if a line was too long and was dropped.
  bool hasRefused() const { return hasRefused_; }

  // Reads the available input, up to a limit, and passes its lines to `take`. Returns false if `take` did or if a line
  // was too long.
  template <class Take>
  bool read(Take&& take) {
    std::array<char, 65536> bytes;
    for (int i = 0; i < kMaxReads; ++i) {
      const ssize_t count = ::read(descriptor_, bytes.data(), bytes.size());
      if (count < 0) return true;  // no input at the moment
      if (count == 0) {
        atEnd_ = true;
        return true;
      }
      text_.append(bytes.data(), static_cast<std::size_t>(count));
      if (!cut(take)) return false;
    }
    return true;
  }

  // The input after the last line end.
  const std::string& rest() const { return text_; }

 private:
  // Few enough to give other descriptors a turn, enough to avoid a poll for each read.
  static constexpr int kMaxReads = 16;

  template <class Take>
  bool cut(Take&& take) {
    std::size_t begin = 0;
    bool goOn = true;
    for (std::size_t end = text_.find('\n', searched_); goOn && end != std::string::npos;
         end = text_.find('\n', begin)) {
      goOn = take(std::string_view(text_).substr(begin, end - begin));
      begin = end + 1;
    }
    text_.erase(0, begin);
    if (goOn && text_.size() > longest_) {
      hasRefused_ = longLines_ == LongLines::kRefuse;
      goOn = !hasRefused_ && take(text_);
      text_.clear();
    }
    searched_ = text_.size();
    return goOn;
  }

  const int descriptor_;
  const std::size_t longest_;
  const LongLines longLines_;
  std::string text_;
  std::size_t searched_ = 0;  // the first `searched_` bytes contain no line end
  bool atEnd_ = false;
  bool hasRefused_ = false;
};

class Supervisor {
 public:
  Supervisor(ChildProcess& child, WatchedSignals& signals, const Supervision& supervision)
      : child_(child),
        signals_(signals),
        supervision_(supervision),
        connection_(child.connectionDescriptor(), kMaxLine, LineReader::LongLines::kRefuse),
        output_(child.outputDescriptor(), kMaxOutputLength, LineReader::LongLines::kCut) {}

  Supervised run() {
    while (!child_.end() && !gaveUp_) {
      wait();
      signals_.drain();
      readAll();
      decide();
    }
    drainEnded();
    if (child_.hasLostGuard()) how_ = SupervisionEnd::kGuardLost;
    if (isInterrupted_) how_ = SupervisionEnd::kInterrupted;
    return {how_, child_.end()};
  }

 private:
  void wait() const {
    std::array<pollfd, 4> watched = {{{signals_.descriptor(), POLLIN, 0},
                                      {child_.hasLostGuard() ? -1 : child_.endDescriptor(), POLLIN, 0},
                                      {connection_.atEnd() ? -1 : connection_.descriptor(), POLLIN, 0},
                                      {output_.atEnd() ? -1 : output_.descriptor(), POLLIN, 0}}};
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(nextMoment() - SteadyClock::now());
    const bool isUrgent = supervision_.isUrgent && supervision_.isUrgent();
    const auto timeout = std::clamp(left, std::chrono::milliseconds(0), isUrgent ? kUrgentTick : kTick);
    const WaitForChild waiting;
    ::poll(watched.data(), watched.size(), static_cast<int>(timeout.count()));
  }

  Moment nextMoment() const { return limit_ ? *limit_ : supervision_.deadline(); }

  void readAll() {
    isBad_ =
        !connection_.read([this](std::string_view line) { return !isBad_ && supervision_.takeLine(line); }) || isBad_;
    output_.read([this](std::string_view line) {
      supervision_.takeOutput(line);
      return true;
    });
    if (supervision_.tick) supervision_.tick();
  }

  void decide() {
    if (child_.end()) return;
    const Moment now = SteadyClock::now();
    if (limit_) {
      goOnEnding(now);
    } else if (child_.hasLostGuard()) {
      kill(now);
    } else if (supervision_.isDone()) {
      limit_ = now + kGrace;  // gives the child time to exit by itself
    } else if (mustEnd()) {
      beginEnding(SupervisionEnd::kInterrupted, now);
    } else if (isBad_) {
      beginEnding(endOfBadConnection(), now);
    } else if (connection_.atEnd()) {
      // A process closes its connection shortly before it ends.
      how_ = SupervisionEnd::kConnectionLost;
      limit_ = std::max<Moment>(now + kGrace, std::min<Moment>(now + kClosing, supervision_.deadline()));
      endsByItself_ = true;
    } else if (now >= supervision_.deadline()) {
      beginEnding(SupervisionEnd::kDeadline, now);
    }
  }

  // True if the child is to be ended because this process was asked to end.
  bool mustEnd() {
    const int requests = signals_.requestsToEnd();
    if (requests == 0) return false;
    const bool isFirst = !std::exchange(isInterrupted_, true);
    return requests > 1 || (isFirst && !(supervision_.mayFinish && supervision_.mayFinish()));
  }

  SupervisionEnd endOfBadConnection() const {
    return connection_.hasRefused() ? SupervisionEnd::kLineTooLong : SupervisionEnd::kConnectionLost;
  }

  void beginEnding(SupervisionEnd how, Moment now) {
    how_ = how;
    if (isImpatient()) {
      kill(now);
      return;
    }
    child_.signalGroup(SIGTERM);
    limit_ = now + kGrace;
  }

  void goOnEnding(Moment now) {
    if (now < *limit_ && !(isImpatient() && !killed_)) return;
    gaveUp_ = killed_;
    endsByItself_ = false;
    kill(now);
  }

  bool isImpatient() const { return signals_.requestsToEnd() > 1; }

  void kill(Moment now) {
    killed_ = true;
    child_.signalGroup(SIGKILL);
    limit_ = now + kMaxDeath;
  }

  // Reads the remaining output of the ended child. It is still in the pipes, which hold less than readAll() reads.
  void drainEnded() {
    if (endsByItself_ && child_.end()) how_ = SupervisionEnd::kEnded;
    child_.signalGroup(SIGKILL);
    readAll();
    // The child ended by itself after an invalid line; everything after that line is ignored.
    if (isBad_ && how_ == SupervisionEnd::kEnded && !child_.end()->bySignal) how_ = endOfBadConnection();
    if (!output_.rest().empty()) supervision_.takeOutput(output_.rest());
  }

  ChildProcess& child_;
  WatchedSignals& signals_;
  const Supervision& supervision_;
  LineReader connection_;
  LineReader output_;
  SupervisionEnd how_ = SupervisionEnd::kEnded;
  std::optional<Moment> limit_;  // when the wait for the child's exit ends
  bool endsByItself_ = false;
  bool killed_ = false;
  bool gaveUp_ = false;
  bool isBad_ = false;
  bool isInterrupted_ = false;
};

}  // namespace

Supervised supervise(ChildProcess& child, WatchedSignals& signals, const Supervision& supervision) {
  return Supervisor(child, signals, supervision).run();
}

}  // namespace quazor
