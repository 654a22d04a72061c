// What every property is checked by.
#include "model/properties/descriptor.h"

namespace simhost {

void check_number(Descriptor const &descriptor, std::int64_t number) {
  auto const &form = descriptor.form;
  bool const is_said = form.kind == FormKind::choice
                           ? form::is_among(number, form.words)
                           : number >= form.least && number <= form.greatest;
  if (!is_said) {
    throw Refused(descriptor.outside);
  }
}

void check_bits(Descriptor const &descriptor, std::int64_t bits) {
  if ((bits & ~form::all_bits(descriptor.form.words)) != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_text(Descriptor const &descriptor, std::string_view text) {
  if (text.size() > descriptor.form.most) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
}

void check_setting(Descriptor const &descriptor, Setting const &setting) {
  descriptor.check_value(descriptor, setting.value);
  if (descriptor.check_place != nullptr) {
    descriptor.check_place(setting);
  }
}

}  // namespace simhost
