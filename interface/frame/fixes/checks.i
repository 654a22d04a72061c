// Whether the fixes took hold. They rest on names of the generator's runtime, and where a generator has
// other names a fix is passed over in silence; so the module looks for each, and without it there is
// no module.
// Stands after all other fixes.

%wrapper %{
static struct {
  char const *name;
  bool (*holds)(PyObject *module);
} const fixes[] = {
  {"module creation", sets_up_created_module},
  {"variables once", adds_variables_once},
  {"failing variables", fails_by_minus_one},
  {"runtime lifetime", keeps_runtime},
  {"overloads", forms_are_told},
  {"pointer comparison", compares_pointers},
  {"pointer representation", shows_chains},
  {"pointer deallocation", drops_chains},
  {"pointer append", appends_once},
  {"pointer ownership", asks_for_truth},
  {"destructors", calls_any_destructor},
};

static bool fixes_hold(PyObject *module) {
  for (size_t i = 0; i < sizeof fixes / sizeof *fixes; i++) {
    if (!fixes[i].holds(module)) {
      PyErr_Format(PyExc_ImportError,
                   SWIG_name ": the fix \"%s\" did not take hold in the runtime of SWIG %x, with "
                   "which this module was generated", fixes[i].name, SWIG_VERSION);
      return false;
    }
  }
  return true;
}
%}
