// Where the bits of each bit field lie in its record's bytes.

#include <gtest/gtest.h>

#include <ostream>
#include <string>
#include <vector>

#include "bit_fields.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes expected_bytes(BitField const &field) {
  Bytes bytes(field.record_size);
  for (unsigned i = 0; i < field.bit_count; ++i) {
    unsigned const bit = field.first_bit + i;
    bytes.at(field.offset + bit / 8) |= static_cast<unsigned char>(1U << bit % 8);
  }
  return bytes;
}

std::string name_of(BitField const &field) {
  return std::string(field.record) + "_" + field.field;
}

class BitFieldTest : public testing::TestWithParam<BitField> {};

TEST_P(BitFieldTest, SetsItsOwnBitsAndNoOthers) {
  Bytes record(GetParam().record_size);
  GetParam().set_all_bits(record.data());
  EXPECT_EQ(record, expected_bytes(GetParam()));
}

std::string test_name(testing::TestParamInfo<BitField> const &info) {
  return name_of(info.param);
}

INSTANTIATE_TEST_SUITE_P(InC, BitFieldTest,
                         testing::ValuesIn(bit_fields_in_c,
                                           bit_fields_in_c + bit_fields_in_c_count),
                         test_name);
INSTANTIATE_TEST_SUITE_P(InCpp, BitFieldTest,
                         testing::ValuesIn(bit_fields_in_cpp,
                                           bit_fields_in_cpp + bit_fields_in_cpp_count),
                         test_name);

}  // namespace

void PrintTo(BitField const &field, std::ostream *out) {
  *out << name_of(field);
}
