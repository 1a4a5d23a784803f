// One symbol, because an object file must not be empty.
extern "C" __attribute__((visibility("default"))) void quazorEmptySharedObject() {}
