// What sanitizers are told in programs that test the helpers; without sanitizers nobody asks.

extern "C" {

/// Sizes that no allocator can serve are part of the tests; they would end the program.
__attribute__((visibility("default"))) char const *__asan_default_options() {
  return "allocator_may_return_null=1";
}

/// What the interpreter allocates once and keeps until the process ends is not ours to free.
__attribute__((visibility("default"))) char const *__lsan_default_suppressions() {
  return "leak:libpython3\n";
}

__attribute__((visibility("default"))) char const *__lsan_default_options() {
  return "print_suppressions=0";
}

}  // extern "C"
