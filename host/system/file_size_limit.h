// What happens when quazor writes beyond the limit on the size of a file (RLIMIT_FSIZE).
#pragma once

namespace quazor {

// From now on such a write fails with EFBIG, like one to a full disk. By default SIGXFSZ ends the process, and with it
// the run and its reports.
void failWritesBeyondFileSizeLimit();

// Undoes it in a new child: a plug-in finds the signal as quazor found it.
void restoreFileSizeSignal();

}  // namespace quazor
