// The measured functions through pybind11, in two forms: as functions like the module's own, and as
// its documentation would have them, classes with attributes and methods.

#include <pybind11/pybind11.h>

#include <cstring>
#include <string>
#include <string_view>

#include "vswitch/configuration.h"
#include "vswitch/queries.h"

namespace py = pybind11;

namespace {

py::str name_text(qex_Name const &name) {
  return {name.string, strnlen(name.string, sizeof name.string)};
}

void set_name_text(qex_Name &name, std::string_view text) {
  if (text.size() >= sizeof name.string) {
    throw py::value_error("at most 31 bytes");
  }
  name.string[text.copy(name.string, text.size())] = '\0';
}

int set_mtu(char const *alias, qex_uint32 mtu) {
  return VSDVS_SetMTU(alias, mtu);
}

py::list port_number(char const *alias, char const *port) {
  int number = 0;
  int const status = VSDVS_DvPortIDToPortID(alias, port, &number);
  py::list result(2);
  result[0] = status;
  result[1] = number;
  return result;
}

int fill_info(char const *alias, VSInfo *info) {
  return VSQEX_GetVSInfo(alias, info);
}

py::list uplinks_of(char const *alias) {
  VSUplinks *uplinks = nullptr;
  int const status = VSQEX_GetUplinks(alias, &uplinks);
  py::list result(2);
  result[0] = status;
  result[1] = py::cast(uplinks, py::return_value_policy::reference);
  return result;
}

char const *uplink_name(VSUplinks const &uplinks, size_t index) {
  if (index >= uplinks.numEntries) {
    throw py::index_error();
  }
  return uplinks.entries[index].name.string;
}

py::object uplink_name_or_none(VSUplinks const &uplinks, int index) {
  if (static_cast<qex_uint32>(index) >= uplinks.numEntries) {
    return py::none();
  }
  return py::str(uplinks.entries[index].name.string);
}

void define_functions(py::module_ &module) {
  // Python does not own what these make: the second frees what the first allocates.
  module.def(
      "new_VSInfo", [] { return new VSInfo{}; }, py::return_value_policy::reference);
  module.def("delete_VSInfo", [](VSInfo *info) { delete info; });
  module.def("VSInfo_mtu_get", [](VSInfo const &info) { return info.mtu; });
  module.def("VSInfo_mtu_set", [](VSInfo &info, qex_uint32 mtu) { info.mtu = mtu; });
  module.def(
      "new_qex_Name", [] { return new qex_Name{}; }, py::return_value_policy::reference);
  module.def("qex_Name_string_get", &name_text);
  module.def("qex_Name_string_set", &set_name_text);
  module.def("VSUplinks___len__", [](VSUplinks const &uplinks) { return uplinks.numEntries; });
  module.def("VSUplinks___getitem__", &uplink_name_or_none);
}

}  // namespace

PYBIND11_MODULE(pybind11_peer, module) {
  py::class_<VSInfo>(module, "VSInfo").def(py::init<>()).def_readwrite("mtu", &VSInfo::mtu);
  py::class_<qex_Name>(module, "qex_Name")
      .def(py::init<>())
      .def_property("string", &name_text, &set_name_text);
  py::class_<VSUplinks>(module, "VSUplinks")
      .def("__len__", [](VSUplinks const &uplinks) { return size_t{uplinks.numEntries}; })
      .def("__getitem__", &uplink_name);
  define_functions(module);
  module.def("VSDVS_SetMTU", &set_mtu);
  module.def("VSDVS_DvPortIDToPortID", &port_number);
  module.def("VSQEX_GetVSInfo", &fill_info);
  module.def("VSQEX_GetUplinks", &uplinks_of);
}
