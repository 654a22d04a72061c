// Bodies of the methods of qex_Name.

#include "helpers/names.h"

extern "C" {

char const *name_text(qex_Name const *name) {
  return name == nullptr ? nullptr : name->string;
}

}  // extern "C"
