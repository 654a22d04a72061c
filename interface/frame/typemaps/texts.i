// Texts: `char *` arguments, and arrays of chars in records and arguments.
// Stands before every function with a text.

// What is no str may be a `char *` object, which is handed on as it is; None is null.
%{
#include "helpers/fast_paths.h"

SWIGINTERN int text_from_pointer(PyObject *object, char **text) {
  static swig_type_info *type = NULL;
  void *pointer = NULL;
  if (!type) type = SWIG_TypeQuery("_p_char");
  if (!SWIG_IsOK(convert_pointer(object, &pointer, type, 0))) return kWrongType;
  *text = (char *)pointer;
  return kConverted;
}

SWIGINTERN int array_text_from_object(PyObject *object, size_t capacity, ArrayText *text) {
  char *pointer = NULL;
  int kind;
  if (is_ascii_text(object, &text->bytes, &text->size)) {
    text->size += 1;
    return fit_array_text(capacity, text);
  }
  if (PyUnicode_Check(object)) return array_text_from_str(object, capacity, text);
  kind = text_from_pointer(object, &pointer);
  return kind == kConverted ? array_text_from_chars(pointer, capacity, text) : kind;
}

/* The text of an argument; a short one is in `room`, with trailing zeros. */
OUT_OF_LINE bool read_array_text(PyObject *object, size_t capacity, char room[2 * kShortText],
                                 ArrayText *text, char const *method, int position,
                                 char const *type) {
  int kind = kConverted;
  text->bytes = capacity < kShortText ? NULL : copy_short_text(object, room);
  if (text->bytes) {
    text->size = kShortText;
    memset(room + kShortText, 0, kShortText);
    return true;
  }
  kind = array_text_from_object(object, capacity, text);
  if (kind != kConverted) report_argument(kind, method, position, type);
  return kind == kConverted;
}
%}

// An argument that is a text: a copy of its UTF-8 bytes, of an ASCII text that is not long in the
// wrapper's frame, of any other on the heap.
%wrapper %{
OUT_OF_LINE char *read_other_text(PyObject *object, char frame[kFrameText], char **heap,
                                  char const *method, int position, char const *type) {
  char const *ascii = NULL;
  char *text = NULL;
  size_t length = 0;
  int kind;
  if (is_ascii_text(object, &ascii, &length) && length < kFrameText) {
    __asm__("" : "+r"(length)); /* hides the bound, for which this would be a string instruction */
    return memcpy(frame, ascii, length + 1);
  }
  if (PyUnicode_Check(object)) {
    kind = text_from_str(object, heap, NULL);
    text = *heap;
  } else {
    kind = text_from_pointer(object, &text);
  }
  if (kind == kConverted) return text;
  report_argument(kind, method, position, type);
  return NO_POINTER;
}

OUT_OF_LINE char *read_text(PyObject *object, char frame[kFrameText], char **heap,
                            char const *method, int position, char const *type) {
  char *text = copy_short_text(object, frame);
  return text ? text : read_other_text(object, frame, heap, method, position, type);
}
%}
%typemap(in, noblock=1) char * (char frame[kFrameText], char *heap = NULL) {
  $1 = read_text($input, frame, &heap, "$symname", $argnum, "$type");
  if ((void *)$1 == NO_POINTER) SWIG_fail;
}
%typemap(freearg, noblock=1, match="in") char * {
  if (heap$argnum) free(heap$argnum);
}
%typemap(in) char const * = char *;
%typemap(freearg, match="in") char const * = char *;

// A field that is an array of chars: the text goes straight into it, with zeros to the end; no text is
// all zeros, and a null record keeps what it has not got.
%typemap(in, noblock=1) char [ANY] (ArrayText text, char room[2 * kShortText]) {
  if (!read_array_text($input, $1_dim0, room, &text, "$symname", $argnum, "$type")) SWIG_fail;
  $1 = (char *)&text;
}
%typemap(memberin, noblock=1) char [ANY] {
  if (arg1) store_array_text($1, sizeof($1), *(ArrayText const *)$input);
}

// An argument that is one: the wrapper's own array.
//
//   %array_argument(char const sid[32])
%define %array_argument(PARAMETER...)
%typemap(in, noblock=1) PARAMETER (ArrayText text, char room[2 * kShortText], char array[$1_dim0]) {
  if (!read_array_text($input, $1_dim0, room, &text, "$symname", $argnum, "$type")) SWIG_fail;
  store_array_text(array, sizeof(array), text);
  $1 = array;
}
%enddef
%typemap(freearg) char [ANY], char const [ANY] "";

// Which form of an overloaded call the arguments fit.
%typemap(typecheck, precedence=SWIG_TYPECHECK_STRING, noblock=1) char *, char const * {
  char *unused = NULL;
  $1 = PyUnicode_Check($input) ? text_from_str($input, NULL, NULL) == kConverted
                               : text_from_pointer($input, &unused) == kConverted;
}
%typemap(typecheck, precedence=SWIG_TYPECHECK_STRING, noblock=1) char [ANY], char const [ANY] {
  ArrayText unused;
  $1 = array_text_from_object($input, $1_dim0, &unused) == kConverted;
}
