// A module over the frame alone: a record, a variable, and a function of two forms, which is all that
// the frame's fixes are about.

%module sample

%include "frame/frame.i"

%{
typedef struct Sample { int number; } Sample;
int const sample_number = 1;
static int take_form(char const *text) { return text != NULL; }
%}

%record(Sample)
typedef struct Sample { int number; } Sample;
int const sample_number;

%rename(take_form) take_other_form;
%{
static int take_other_form(char const *text, char const *more) { return text != more; }
%}
int take_form(char const *text);
int take_other_form(char const *text, char const *more);
%overloaded(take_form)
