// refused with: deleted
#include "platform/task.h"

void run(quazor::Task& task) {
#ifdef CORRECTED
  quazor::Task mine = std::move(task);
#else
  quazor::Task mine = task;
#endif
  mine();
}
