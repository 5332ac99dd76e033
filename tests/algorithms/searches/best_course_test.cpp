#include "algorithms/searches/best_course.h"

#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "evaluation/evaluation_result.h"

namespace mirevo {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

BestCourse courseOf(const std::vector<double>& aggregates) {
  BestCourse course;
  for (const double aggregate : aggregates) course.add(aggregate);
  return course;
}

/// 40 evaluations: `quarter`, then `half` from the 11th on, then `end` from the 21st on.
BestCourse stepsOf(double quarter, double half, double end) {
  BestCourse course;
  for (int i = 1; i <= 40; ++i) course.add(i <= 10 ? quarter : i <= 20 ? half : end);
  return course;
}

std::string textOf(const BestCourse& course, bool isBudgetUsed, bool isRepetition = false) {
  std::string text;
  for (const std::string& line : courseLines(course, isBudgetUsed, isRepetition)) text += line + "\n";
  return text;
}

TEST(BestCourse, KeepsTheBestWhateverComesLater) {
  const BestCourse course = courseOf({kFailedRunValue, 5.0, 7.0, 3.0, 3.0, kFailedRunValue, 4.0});
  EXPECT_EQ(course.evaluationCount(), 7);
  const std::vector<double> expected{kFailedRunValue, kFailedRunValue, 5.0, 5.0, 3.0, 3.0, 3.0, 3.0};
  for (int count = 0; count <= 7; ++count) EXPECT_EQ(course.bestAfter(count), expected[count]) << count;
  EXPECT_EQ(course.steps().size(), 2);
}

TEST(BestCourse, ExpectsAFallLikeThoseBefore) {
  EXPECT_DOUBLE_EQ(stepsOf(8.0, 4.0, 2.0).expectedFall(), 1.0);  // 4, 2, so 1
  EXPECT_DOUBLE_EQ(stepsOf(5.0, 4.0, 1.0).expectedFall(), 3.0);  // faster and faster: not more than the last
  EXPECT_DOUBLE_EQ(stepsOf(5.0, 4.0, 4.0).expectedFall(), 0.0);
  EXPECT_DOUBLE_EQ(stepsOf(-1.0, -5.0, -7.0).expectedFall(), 1.0);
  EXPECT_DOUBLE_EQ(stepsOf(kFailedRunValue, 4.0, 2.0).expectedFall(), 0.0);
  EXPECT_DOUBLE_EQ(courseOf({}).expectedFall(), 0.0);
}

TEST(BestCourse, IsToldByWhatAnotherRunCouldBring) {
  EXPECT_THAT(textOf(stepsOf(8.0, 4.0, 2.0), true),
              AllOf(HasSubstr("fell from 4 to 2 (50 %)"), HasSubstr("evaluation 21 of 40"),
                    HasSubstr("in the last tenth it did not"), HasSubstr("about 1.")));
  EXPECT_THAT(textOf(stepsOf(8.0, 4.0, 4.0), true),
              AllOf(HasSubstr("the second half found no better one"), HasSubstr("come to rest")));
  EXPECT_THAT(textOf(stepsOf(8.0, 4.0, 2.0), false), AllOf(HasSubstr("ended by itself"), Not(HasSubstr("about 1"))));
  EXPECT_THAT(textOf(stepsOf(-1.0, -5.0, -7.0), true), AllOf(HasSubstr("from -5 to -7,"), HasSubstr("about -8.")));
  EXPECT_THAT(textOf(stepsOf(kFailedRunValue, kFailedRunValue, 2.0), true),
              AllOf(HasSubstr("none of the first half succeeded"), Not(HasSubstr("more evaluations"))));
  EXPECT_THAT(courseLines(courseOf(std::vector<double>(40, kFailedRunValue)), true), IsEmpty());
  EXPECT_THAT(courseLines(courseOf({3.0, 2.0, 1.0}), true), IsEmpty());
}

TEST(BestCourse, OfARepetitionIsCountedForItselfAndHeldAgainstTheOthers) {
  for (const bool isBudgetUsed : {true, false}) {
    EXPECT_THAT(textOf(stepsOf(8.0, 4.0, 4.0), isBudgetUsed, true),
                AllOf(StartsWith("Course over the evaluations of this repetition: "),
                      HasSubstr("found by its evaluation 11 of 40"), HasSubstr("the other repetitions can tell"),
                      Not(HasSubstr("Random_Seed"))))
        << isBudgetUsed;
  }
}

TEST(BestCourse, APositiveValueIsNotExpectedToFallBelowZero) {
  EXPECT_THAT(textOf(stepsOf(8.0, 4.0, 1.0), true), HasSubstr("about 0. Such"));
  EXPECT_THAT(textOf(stepsOf(3.0, 1.0, 0.0), true),
              AllOf(HasSubstr("fell from 1 to 0, "), HasSubstr("has come to rest"), Not(HasSubstr("about"))));
}

TEST(BestCourse, BeginsAnewWithAnotherScale) {
  BestCourse course = courseOf({1.0, 2.0});
  course.clear();
  course.add(9.0);
  EXPECT_EQ(course.evaluationCount(), 1);
  EXPECT_EQ(course.bestAfter(1), 9.0);
}

}  // namespace
}  // namespace mirevo
