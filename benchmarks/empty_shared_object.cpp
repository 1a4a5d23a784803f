// Nothing but one symbol, so that the object file is not empty.
extern "C" __attribute__((visibility("default"))) void quazorEmptySharedObject() {}
