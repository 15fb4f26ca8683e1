#ifndef ORVEX_API_ALGO_DATA_TYPES_VECTOR_TARGETS_TESTING_H_
#define ORVEX_API_ALGO_DATA_TYPES_VECTOR_TARGETS_TESTING_H_

// Test-only: runs a parameterised gtest suite once per instruction set that
// the data kernels were compiled for and the CPU (or emulator) supports, so
// that every vector path is compared against the scalar reference on the
// machine at hand (SSE4/AVX2/... on x86-64, NEON/SVE/SVE2 on 64-bit Arm).
//
//   class MyTest : public VectorTargetTest {};
//   TEST_P(MyTest, Case) { ... }
//   ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(MyTest);
//
// Each test first checks that the kernels really dispatch to its target. At
// the end of the program one line lists the targets that ran, so that test
// logs show which code paths a platform exercised.

#include <cstdint>
#include <cstdio>
#include <set>
#include <string>

#include "gtest/gtest.h"
#include "hwy/targets.h"
#include "orvex/api/algo/data_types/data_kernels.h"

namespace orvex {

class VectorTargetTest : public ::testing::TestWithParam<int64_t> {
 public:
  static std::set<int64_t>& ExercisedTargets() {
    static std::set<int64_t> targets;
    return targets;
  }

 protected:
  void SetUp() override {
    hwy::SetSupportedTargetsForTest(GetParam());
    ASSERT_EQ(DataKernelsTarget(), GetParam())
        << "kernels dispatch to " << hwy::TargetName(DataKernelsTarget()) << " instead of "
        << hwy::TargetName(GetParam());
    ExercisedTargets().insert(GetParam());
  }
  void TearDown() override { hwy::SetSupportedTargetsForTest(0); }
};

// Prints "Vector targets exercised: NEON SVE ..." once all tests have run.
class VectorTargetReport : public ::testing::Environment {
 public:
  void TearDown() override {
    std::string names;
    for (int64_t t : VectorTargetTest::ExercisedTargets()) {
      names += ' ';
      names += hwy::TargetName(t);
    }
    std::printf("Vector targets exercised:%s\n", names.empty() ? " none" : names.c_str());
  }
};
inline ::testing::Environment* const kVectorTargetReport =
    ::testing::AddGlobalTestEnvironment(new VectorTargetReport);

inline std::string VectorTargetName(const ::testing::TestParamInfo<int64_t>& info) {
  return hwy::TargetName(info.param);
}

}  // namespace orvex

#define ORVEX_INSTANTIATE_FOR_VECTOR_TARGETS(suite)                                    \
  INSTANTIATE_TEST_SUITE_P(VectorTargets, suite,                                       \
                           ::testing::ValuesIn(::hwy::SupportedAndGeneratedTargets()), \
                           ::orvex::VectorTargetName)

#endif  // ORVEX_API_ALGO_DATA_TYPES_VECTOR_TARGETS_TESTING_H_
