#pragma once

#include <gmock/gmock.h>

/// The matchers that most tests use.
namespace mirevo {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::DoubleEq;
using ::testing::DoubleNear;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::NanSensitiveFloatEq;
using ::testing::Not;
using ::testing::StartsWith;

}  // namespace mirevo
