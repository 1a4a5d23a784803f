// The frames of a diagnostic: their intervals, and how they go with those of the other streams.
#pragma once

#include "host/record/record_file.h"

#include <string>
#include <vector>

namespace quazor {

// What is done with streams that have more frames than a picture shows one by one.
enum class ManyFrames {
  kPictures,   // pictures show them
  kZoomed,     // the page has all of them, for the script that zooms
  kNoLibrary,  // pictures show them, and a sentence says what would zoom
};

// True if a stream has more frames than a picture shows one by one.
bool hasManyFrames(const std::vector<RecordedStream>& streams);

// A table of the streams, and for each a sentence and plots of the interval between its frames and of its offset
// against the stream that began first. `level` is that of the headings. Empty without frames.
std::string framesSection(const std::vector<RecordedStream>& streams, int level, ManyFrames many);

// Which cameras the diagnostic saw: the streams that delivered frames to it, and the master that its log names, which
// offsets between cameras refer to. Empty if neither is known.
std::string camerasParagraph(const DiagnosticRecord& record, const std::vector<RecordedStream>& streams);

// A sentence, a table and a plot of the intervals between the frames of two recordings of one stream.
std::string comparedIntervals(const RecordedStream& before, const RecordedStream& after);

}  // namespace quazor
