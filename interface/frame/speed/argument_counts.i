// Counting and taking arguments.
// Stands before everything that generates a wrapper.

// Counting arguments is the interpreter's business: on another count than the right one its own
// parser raises its own error. On the right one the items are taken straight from the tuple.
%insert("runtime") %{
#define TAKE_0(args) (void)0
#define TAKE_1(args, a) *(a) = PyTuple_GET_ITEM(args, 0)
#define TAKE_2(args, a, b) TAKE_1(args, a), *(b) = PyTuple_GET_ITEM(args, 1)
#define TAKE_3(args, a, b, c) TAKE_2(args, a, b), *(c) = PyTuple_GET_ITEM(args, 2)
#define TAKE_4(args, a, b, c, d) TAKE_3(args, a, b, c), *(d) = PyTuple_GET_ITEM(args, 3)
#define TAKE_5(args, a, b, c, d, e) TAKE_4(args, a, b, c, d), *(e) = PyTuple_GET_ITEM(args, 4)
#define TAKE_6(args, a, b, c, d, e, f) TAKE_5(args, a, b, c, d, e), *(f) = PyTuple_GET_ITEM(args, 5)
#define TAKE_7(args, a, b, c, d, e, f, g) \
  TAKE_6(args, a, b, c, d, e, f), *(g) = PyTuple_GET_ITEM(args, 6)
#define TAKE_8(args, a, b, c, d, e, f, g, h) \
  TAKE_7(args, a, b, c, d, e, f, g), *(h) = PyTuple_GET_ITEM(args, 7)

/* A wrapper counts before it does anything else, so on another count it is done: a call in its place
   needs no frame, nor does the shortest way through it then. */
#define PyArg_UnpackTuple(args, method, least, most, ...)                                   \
  ({                                                                                        \
    if (PyTuple_GET_SIZE(args) != (most)) return report_argument_count(args, method, most); \
    TAKE_##most(args, ##__VA_ARGS__);                                                       \
    1;                                                                                      \
  })
%}
