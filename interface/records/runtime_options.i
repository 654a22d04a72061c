// Runtime options lists. A caller builds one and frees it; one that a query returns is released to the
// library with VSQEX_FreeMemory. Headers lie in their list.

%record(VSRuntimeOptionHeader)
%sized_record(VSRuntimeOptions, runtime_options_new)
%required(VSRuntimeOptionHeader *at)
%required(VSRuntimeOptionHeader *option)
%required(char *option_name)
%required(char *option_text)

%include "vswitch/runtime_options.h"

%extend VSRuntimeOptions {
  VSRuntimeOptionHeader *add_int_option(VSRuntimeOptionHeader *at, char *name, int type,
                                        int value) {
    return runtime_options_add_int($self, at, name, type, value);
  }
  VSRuntimeOptionHeader *add_str_option(VSRuntimeOptionHeader *at, char *name, int type,
                                        char *option_text) {
    return runtime_options_add_text($self, at, name, type, option_text);
  }
  void set_options_length(int used) { runtime_options_set_length($self, used); }
  VSRuntimeOptionHeader *get_first_option() { return runtime_options_first($self); }
  VSRuntimeOptionHeader *get_next_option(VSRuntimeOptionHeader *option) {
    return runtime_options_next($self, option);
  }
}

%extend VSRuntimeOptionHeader {
  char const *get_option_name() { return runtime_option_name($self); }
  PyObject *get_option_value() { return runtime_option_value($self); }
}

int get_runtime_option_type_from_name(char *option_name);
