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

static inline int read_text(PyObject *object, char *frame, char **heap, char **text) {
  char const *ascii = NULL;
  size_t length = 0;
  if (is_ascii_text(object, &ascii, &length) && length < kFrameText) {
    copy_short(frame, ascii, length + 1);
    *text = frame;
    return kConverted;
  }
  return other_text(object, heap, text);
}

SWIGINTERN int read_char_array(PyObject *object, char *array, size_t capacity) {
  char *text = NULL;
  int kind;
  if (PyUnicode_Check(object)) return char_array_from_str(object, array, capacity);
  kind = text_from_pointer(object, &text);
  if (kind != kConverted) return kind;
  return char_array_from_text(text, text ? strlen(text) + 1 : 0, array, capacity);
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

// An array argument: the text, its NUL, and zeros to the end; no text is all zeros.
%typemap(in, noblock=1) char [ANY] (char array[$1_dim0], int kind) {
  kind = read_char_array($input, array, $1_dim0);
  if (kind != kConverted) %bad_argument(kind, "$type");
  $1 = array;
}
%typemap(in) char const [ANY] = char [ANY];
%typemap(freearg) char [ANY], char const [ANY] "";

// A null record keeps what it has not got.
%typemap(memberin, noblock=1) char [ANY] {
  if (arg1) memcpy($1, $input, sizeof($1));
}

// Which form of an overloaded call the arguments fit.
%typemap(typecheck, precedence=SWIG_TYPECHECK_STRING, noblock=1) char *, char const * {
  char *unused = NULL;
  $1 = PyUnicode_Check($input) ? text_from_str($input, NULL, NULL) == kConverted
                               : text_from_pointer($input, &unused) == kConverted;
}
%typemap(typecheck, precedence=SWIG_TYPECHECK_STRING, noblock=1) char [ANY], char const [ANY] {
  $1 = read_char_array($input, NULL, $1_dim0) == kConverted;
}
