// What C's declarations leave open about the calls: families, arrays and their lengths, nulls, and
// whose memory is whose. Nothing of it changes a wrapper. It is said for all that is made beside the
// module, which reads it through python/call_model.py: classes, stubs, the reference.
//
//   %calls(FAMILY, DEALLOCATOR)           the calls from here on: what they leave behind a pointer of the
//                                         caller's they allocate, and DEALLOCATOR releases it
//   %end_calls                            up to here; it ends what the next two say, too
//   %bytes(argument, length)              where a call has both, `argument` is so many bytes
//   %elements(argument, count)            likewise, so many elements
//   %volatile(argument, kind)             likewise, it is each host's own: where calls of two hosts are held
//                                         to each other it is mapped, not compared. The kinds are those of
//                                         call_model.Volatile
//
// Of one call, before it is declared; RESULT stands for what it returns:
//
//   %allocates(CALL, argument, DEALLOCATOR)  as above, with another deallocator
//   %unless(CALL, argument, words)        when that deallocator is not the one
//   %shows(CALL, argument, words)         it is a view that nobody releases, good until what words say
//   %releases(CALL, argument)             the call is a deallocator
//   %reads(CALL, argument)                what C could write there it only reads
//   %length(CALL, argument, length)       `argument` is as many bytes as `length` says
//   %form(CALL, argument, mode)           `argument` is an address, or has such as entries, of the form
//                                         that `mode` names
//   %nullable(CALL, argument)             null is allowed, of a counted argument with a length of 0
//   %volatile_of(CALL, argument, kind)    as %volatile, of this call
//   %asks(CALL)                           it changes nothing of the host; of any other, it may
//
// Of a field, before its record is declared:
//
//   %volatile_field(RECORD::field, kind)  as %volatile

%define %calls(FAMILY, DEALLOCATOR...)
%feature("family", "FAMILY");
%feature("deallocator", "DEALLOCATOR");
%enddef

%define %end_calls
%feature("family", "");
%feature("deallocator", "");
%bytes(data, )
%bytes(state, )
%bytes(input, )
%bytes(output, )
%elements(ids, )
%elements(ranges, )
%elements(entries, )
%volatile(switchId, )
%volatile(portsetName, )
%volatile(portsetBuffer, )
%volatile(portID, )
%volatile(state, )
%enddef

%define %bytes(ARGUMENT, LENGTH)
%feature("bytes:ARGUMENT", "LENGTH");
%enddef

%define %elements(ARGUMENT, COUNT)
%feature("elements:ARGUMENT", "COUNT");
%enddef

%define %volatile(ARGUMENT, KIND)
%feature("volatile:ARGUMENT", "KIND");
%enddef

%define %allocates(CALL, ARGUMENT, DEALLOCATOR)
%feature("allocates:ARGUMENT", "DEALLOCATOR") CALL;
%enddef

%define %unless(CALL, ARGUMENT, WORDS)
%feature("unless:ARGUMENT", WORDS) CALL;
%enddef

%define %shows(CALL, ARGUMENT, WORDS)
%feature("shows:ARGUMENT", WORDS) CALL;
%enddef

%define %releases(CALL, ARGUMENT)
%feature("releases:ARGUMENT", "1") CALL;
%enddef

%define %reads(CALL, ARGUMENT)
%feature("reads:ARGUMENT", "1") CALL;
%enddef

%define %length(CALL, ARGUMENT, LENGTH)
%feature("bytes:ARGUMENT", "LENGTH") CALL;
%enddef

%define %form(CALL, ARGUMENT, MODE)
%feature("form:ARGUMENT", "MODE") CALL;
%enddef

%define %nullable(CALL, ARGUMENT)
%feature("nullable:ARGUMENT", "1") CALL;
%enddef

%define %volatile_of(CALL, ARGUMENT, KIND)
%feature("volatile:ARGUMENT", "KIND") CALL;
%enddef

%define %asks(CALL)
%feature("asks", "1") CALL;
%enddef

%define %volatile_field(FIELD, KIND)
%feature("volatile", "KIND") FIELD;
%enddef
