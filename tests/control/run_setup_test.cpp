#include "control/run_setup.hpp"

#include <gtest/gtest.h>

#include <csignal>

#include "control/date_time.hpp"
#include "control/signals.hpp"

namespace vhd {
namespace {

TEST(ThreadCount, RequestIsBoundedByProcessorsAndMaximum) {
  const ComputeResources r{8, 4};  // 8 threads allowed, 4 processors
  EXPECT_EQ(ThreadCountFor(-1, r), 4);
  EXPECT_EQ(ThreadCountFor(2, r), 2);
  EXPECT_EQ(ThreadCountFor(6, r), 4);
  EXPECT_EQ(ThreadCountFor(0, r), 1);
  EXPECT_EQ(ThreadCountFor(-5, r), 1);

  const ComputeResources limited{3, 16};  // OMP_NUM_THREADS=3 on 16 processors
  EXPECT_EQ(ThreadCountFor(-1, limited), 3);
  EXPECT_EQ(ThreadCountFor(2, limited), 2);
  EXPECT_EQ(ThreadCountFor(10, limited), 3);
}

TEST(DateTime, StepTimesCrossDaysMonthsAndLeapYears) {
  const DateTime start{2004, 2, 28, 23, 59, 0};
  EXPECT_EQ(FormatDateTime(AddSeconds(start, 0.0)), "2004-02-28 23:59:00");
  EXPECT_EQ(FormatDateTime(AddSeconds(start, 90.0)), "2004-02-29 00:00:30");
  EXPECT_EQ(FormatDateTime(AddSeconds(start, 86400.0 + 60.0)), "2004-03-01 00:00:00");
  EXPECT_EQ(FormatDateTime(AddSeconds({2003, 2, 28, 0, 0, 0}, 86400.0)), "2003-03-01 00:00:00");
  EXPECT_EQ(FormatDateTime(AddSeconds({1999, 12, 31, 23, 0, 0}, 3600.0)), "2000-01-01 00:00:00");
  // 100 years of seconds (25 leap days in 1901..2000).
  EXPECT_EQ(FormatDateTime(AddSeconds({1901, 1, 1, 0, 0, 0}, (100 * 365.0 + 25) * 86400.0)),
            "2001-01-01 00:00:00");
  // A step time a hair below a whole second stays on that second.
  EXPECT_EQ(FormatDateTime(AddSeconds({2004, 1, 1, 0, 0, 0}, 3 * 0.1 * 10 - 1e-12)),
            "2004-01-01 00:00:03");
}

TEST(DateTime, Validity) {
  EXPECT_TRUE(IsValidDateTime({2004, 2, 29, 23, 59, 59}));
  EXPECT_FALSE(IsValidDateTime({2003, 2, 29, 0, 0, 0}));
  EXPECT_FALSE(IsValidDateTime({1900, 2, 29, 0, 0, 0}));
  EXPECT_TRUE(IsValidDateTime({2000, 2, 29, 0, 0, 0}));
  EXPECT_FALSE(IsValidDateTime({2004, 13, 1, 0, 0, 0}));
  EXPECT_FALSE(IsValidDateTime({2004, 4, 31, 0, 0, 0}));
  EXPECT_FALSE(IsValidDateTime({2004, 1, 1, 24, 0, 0}));
  EXPECT_FALSE(IsValidDateTime({2004, 1, 1, 0, 60, 0}));
  EXPECT_FALSE(IsValidDateTime({2004, 1, 0, 0, 0, 0}));
}

TEST(Signals, MessagesBySignalAndSubCode) {
  EXPECT_EQ(SignalMessage(SIGTERM, 0), "Termination request");
  EXPECT_EQ(SignalMessage(SIGINT, 0), "Control-C send");
  EXPECT_EQ(SignalMessage(SIGSEGV, 0), "Illegal storage access");
  EXPECT_EQ(SignalMessage(SIGILL, 0), "Illegal instruction");
  EXPECT_EQ(SignalMessage(SIGABRT, 0), "Abnormal termination");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_FLTDIV), "Floating point exception: Zero divide");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_FLTINV), "Floating point exception: Invalid number");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_FLTOVF), "Floating point exception: Overflow");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_FLTRES), "Floating point exception: Inexact precision");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_INTDIV), "Floating point exception: Non-IEEE type");
  EXPECT_EQ(SignalMessage(SIGFPE, FPE_FLTUND), "");
}

// A floating-point exception signal (not a masked underflow): the handler
// reports it and ends with the signal number. (Raised, not provoked by an
// integer division by zero, which the undefined-behaviour sanitizer stops
// first.)
TEST(Signals, HandlerEndsWithTheSignalNumber) {
  EXPECT_EXIT(
      {
        InstallSignalHandlers();
        std::raise(SIGFPE);
      },
      ::testing::ExitedWithCode(SIGFPE), "");
}

TEST(FloatingPoint, DenormalsAreFlushedToZero) {
  EXPECT_EXIT(
      {
        SetFlushToZero();
        volatile double tiny = 1e-300;
        volatile double scale = 1e-20;
        const double product = tiny * scale;  // 1e-320 is a denormal
        std::exit(product == 0.0 ? 0 : 1);
      },
      ::testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace vhd
