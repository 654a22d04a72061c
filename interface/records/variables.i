// The module's variables, read through `cvar`.

%{
extern qex_ModuleID const qex_ModuleCurrentID;
%}
extern qex_ModuleID const qex_ModuleCurrentID;
