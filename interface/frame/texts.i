// Texts: `char *` arguments, and arrays of chars in records and arguments.
// Stands before every function with a text.

// A copy of the text's UTF-8 bytes: of a short ASCII text in the wrapper's frame, of any other on the
// heap. What is no str may be a `char *` object, which is handed on as it is; None is null.
%{
SWIGINTERN int text_from_pointer(PyObject *object, char **text) {
  static swig_type_info *type = NULL;
  void *pointer = NULL;
  if (!type) type = SWIG_TypeQuery("_p_char");
  if (!SWIG_IsOK(SWIG_ConvertPtr(object, &pointer, type, 0))) return kWrongType;
  *text = (char *)pointer;
  return kConverted;
}

SWIGINTERN int other_text(PyObject *object, char **heap, char **text) {
  int kind;
  if (!PyUnicode_Check(object)) return text_from_pointer(object, text);
  kind = text_from_str(object, heap, NULL);
  *text = *heap;
  return kind;
}

/* One copy for all wrappers: a call costs less than the code at every argument would. */
__attribute__((noinline)) SWIGINTERN int read_text(PyObject *object, char *frame, char **heap,
                                                   char **text) {
  char const *ascii = NULL;
  size_t length = 0;
  if (is_ascii_text(object, &ascii, &length) && length < kFrameText) {
    copy_short(frame, ascii, length + 1);
    *text = frame;
    return kConverted;
  }
  return other_text(object, heap, text);
}

__attribute__((noinline)) SWIGINTERN int read_array_text(PyObject *object, size_t capacity,
                                                         ArrayText *text) {
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
%}

%typemap(in, noblock=1) char * (char frame[kFrameText], char *heap = NULL, char *text = NULL,
                                int kind) {
  kind = read_text($input, frame, &heap, &text);
  if (kind != kConverted) %bad_argument(kind, "$type");
  $1 = text;
}
%typemap(freearg, noblock=1, match="in") char * {
  if (heap$argnum) free(heap$argnum);
}
%typemap(in) char const * = char *;
%typemap(freearg, match="in") char const * = char *;

// A field that is an array of chars: the text goes straight into it, with zeros to the end; no text is
// all zeros, and a null record keeps what it has not got.
%typemap(in, noblock=1) char [ANY] (ArrayText text, int kind) {
  kind = read_array_text($input, $1_dim0, &text);
  if (kind != kConverted) %bad_argument(kind, "$type");
  $1 = (char *)&text;
}
%typemap(memberin, noblock=1) char [ANY] {
  if (arg1) store_array_text($1, sizeof($1), *(ArrayText const *)$input);
}

// An argument that is one: the wrapper's own array.
//
//   %array_argument(char const sid[32])
%define %array_argument(PARAMETER...)
%typemap(in, noblock=1) PARAMETER (ArrayText text, char array[$1_dim0], int kind) {
  kind = read_array_text($input, $1_dim0, &text);
  if (kind != kConverted) %bad_argument(kind, "$type");
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
  $1 = read_array_text($input, $1_dim0, &unused) == kConverted;
}
