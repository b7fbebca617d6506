// A module whose table is null.
extern "C" __attribute__((visibility("default"))) const void* GetAPITable() { return nullptr; }
