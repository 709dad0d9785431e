// For builds with sanitizers: a program that another one starts without variables, out of mixed
// ids, cannot look for leaks, and would say so on its standard error.
extern "C" const char* __asan_default_options() __attribute__((visibility("default")));
extern "C" const char* __asan_default_options() {
  return "detect_leaks=0";
}
