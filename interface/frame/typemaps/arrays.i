// Plain arrays of a record, for calls that take a pointer to the first element and a count.
//
//   %record_array(qex_NEBPortVIDRange, vidrangeArray)
//       new_vidrangeArray(n)              room for n elements, not zero-filled, owned
//       delete_vidrangeArray(a)           frees it
//       vidrangeArray_getitem(a, i)       a copy of an element, owned
//       vidrangeArray_setitem(a, i, e)    copies a value into an element
//
// Indexes are not checked. Stands before the records that use it.

%define %record_array(TYPE, NAME)
%{
static TYPE *new_##NAME(size_t nelements) { return reallocarray(NULL, nelements, sizeof(TYPE)); }
static void delete_##NAME(TYPE *array) { free(array); }
static TYPE NAME##_getitem(TYPE *array, size_t index) { return array[index]; }
static void NAME##_setitem(TYPE *array, size_t index, TYPE value) { array[index] = value; }
%}

%newobject new_##NAME;
%feature("releases:DISOWN", "1") delete_##NAME;
%feature("elements:RESULT", "nelements") new_##NAME;
%feature("within:index", "REQUIRED") NAME##_getitem;
%feature("within:index", "REQUIRED") NAME##_setitem;
TYPE *new_##NAME(size_t nelements);
void delete_##NAME(TYPE *DISOWN);
TYPE NAME##_getitem(TYPE *REQUIRED, size_t index);
void NAME##_setitem(TYPE *REQUIRED, size_t index, TYPE value);
%enddef
