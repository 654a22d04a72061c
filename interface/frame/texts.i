// Texts: `char *` arguments and results, and arrays of chars in records and arguments. Arguments are
// read by pyfragments.swg. Stands before every function with a text.

// A null record keeps what it has not got; a null text fills the array with zeros.
%typemap(memberin, noblock=1) char [ANY] {
  if (arg1) memcpy($1, $input, sizeof($1));
}
