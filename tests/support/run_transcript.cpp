#include "tests/support/run_transcript.h"

#include "contract/message_format.h"

#include <utility>

namespace quazor {

namespace {

class TranscriptLog final : public LogBackend {
 public:
  explicit TranscriptLog(std::shared_ptr<std::vector<std::string>> lines) : lines_(std::move(lines)) {}

  void write(LogLevel level, std::string_view, std::string_view, std::string_view text) override {
    lines_->push_back("log " + std::string(name(level)) + ": " + std::string(text));
  }

 private:
  static std::string_view name(LogLevel level) {
    switch (level) {
      case LogLevel::kError: return "error";
      case LogLevel::kDefault: return "default";
      case LogLevel::kDebug: return "debug";
    }
    return "of an unknown level";
  }

  std::shared_ptr<std::vector<std::string>> lines_;
};

// The format of an operation: OBJECT VERB DETAIL.
struct Wording {
  std::string_view operation;  // without its interface
  std::string_view verb;
};
constexpr Wording kWordings[] = {
    {"createPlugIn", "create plug-in"},
    {"device", "get device"},
    {"synchronizedStreamsGroups", "get groups"},
    {"streams", "get streams"},
    {"requestControlOfStreams", "request control"},
    {"relinquishControlOfStreams", "relinquish control"},
    {"valueForProperty", "get"},
    {"setValue", "set"},
};

// The names of objects that are the only ones of their interface.
constexpr Wording kOnlyObjects[] = {
    {"CaptureService", "service"},
    {"CapturePlugIn", "plug-in"},
    {"CaptureDevice", "device"},
    {"Clock", "clock"},
};

template <std::size_t Count>
std::string_view wording(const Wording (&wordings)[Count], std::string_view word) {
  for (const Wording& candidate : wordings) {
    if (candidate.operation == word) return candidate.verb;
  }
  return word;
}

std::string callLine(std::string_view operation, std::string_view object, std::string_view detail) {
  const std::size_t point = operation.find('.');
  std::string line(object.empty() ? wording(kOnlyObjects, operation.substr(0, point)) : object);
  line += ' ';
  line += wording(kWordings, operation.substr(point + 1));
  if (!detail.empty()) {
    line += ' ';
    line += detail;
  }
  return line;
}

std::string errorLine(ErrorPlace place, const DiagnosticErrorPtr& error) {
  if (place == ErrorPlace::kNone) return "no place for an error";
  if (error == callersOwnError()) return "error untouched";
  if (error == nullptr) return "error emptied";
  return "error " + errorChain(error);
}

}  // namespace

RunTranscript::RunTranscript() : lines_(std::make_shared<std::vector<std::string>>()) {
  sharedLog().setBackend(std::make_shared<TranscriptLog>(lines_), LogLevel::kDebug);
}

RunTranscript::~RunTranscript() { sharedLog().setBackend(nullptr, LogLevel::kDebug); }

void RunTranscript::addCall(std::string_view operation, std::string_view object, std::string_view detail,
                            bool succeeded) {
  if (operation != "Clock.sleep") ++fallibleCalls_;
  lines_->push_back(callLine(operation, object, detail) + (succeeded ? "" : " -> failed"));
}

std::string RunTranscript::text() const {
  std::string text;
  for (const std::string& line : *lines_) text += line + '\n';
  return text;
}

const DiagnosticErrorPtr& callersOwnError() {
  static const DiagnosticErrorPtr error = makeError("CallerErrorDomain", 1, "Here before the run.");
  return error;
}

std::string errorChain(const DiagnosticErrorPtr& error) {
  std::string chain = defaultText(error);
  for (DiagnosticErrorPtr cause = error->underlyingError(); cause != nullptr; cause = cause->underlyingError()) {
    chain += ", caused by " + defaultText(cause);
  }
  return chain;
}

std::string runAndTell(QZExperiment& experiment, ErrorPlace place, RunTranscript& transcript) {
  const std::size_t before = transcript.text().size();
  DiagnosticErrorPtr error = callersOwnError();
  const auto result = experiment.run(place == ErrorPlace::kGiven ? &error : nullptr);
  std::string told = transcript.text().substr(before);
  told += result == nullptr ? "returned nothing\n" : "returned a result\n";
  told += errorLine(place, error) + '\n';
  if (result == nullptr) return told;
  for (const auto& [key, measurement] : result->measurements()) {
    told += key + " = " + defaultText(measurement.value()) + ' ' + measurement.unit().symbol() + '\n';
  }
  for (const auto& [key, value] : result->auxiliaryData()) told += key + " = " + defaultText(value) + '\n';
  return told;
}

}  // namespace quazor
