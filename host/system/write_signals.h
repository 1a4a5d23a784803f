// What happens when quazor writes where nothing can be written any more.
#pragma once

namespace quazor {

// From now on such a write fails: beyond the limit on the size of a file (RLIMIT_FSIZE) with EFBIG, like one to a full
// disk, and to a pipe that nobody reads with EPIPE. By default SIGXFSZ and SIGPIPE end the process, and with it the run
// and its reports.
void failWritesWithoutSignals();

// Undoes it in a new child: a plug-in finds the signals as quazor found them.
void restoreWriteSignals();

}  // namespace quazor
