#include "control/signals.hpp"

#include <ucontext.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <string>

#if defined(__SSE__)
#include <xmmintrin.h>
#endif

#include "log/log.hpp"

namespace vhd {

namespace {

constexpr int kHandledSignals[] = {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM, SIGFPE, SIGALRM};

volatile std::sig_atomic_t g_in_handler = 0;
volatile std::sig_atomic_t g_pending_request = 0;  // interrupt or termination not yet acted on
volatile std::sig_atomic_t g_grace_seconds = 10;

#if defined(__x86_64__)
// Masks the underflow trap in the interrupted context, so that the faulting
// instruction completes with its default result when the handler returns.
void MaskUnderflowTrap(void* context) {
  auto* uc = static_cast<ucontext_t*>(context);
  if (uc && uc->uc_mcontext.fpregs) {
    constexpr unsigned kUnderflowMask = 0x0800;
    constexpr unsigned kExceptionFlags = 0x003f;
    uc->uc_mcontext.fpregs->mxcsr |= kUnderflowMask;
    uc->uc_mcontext.fpregs->mxcsr &= ~kExceptionFlags;
  }
}
#else
void MaskUnderflowTrap(void*) {}
#endif

void HandleSignal(int signo, siginfo_t* info, void* context) {
  const int code = info ? info->si_code : 0;
  if (signo == SIGFPE && code == FPE_FLTUND) {
    MaskUnderflowTrap(context);
    return;
  }
  if (signo == SIGALRM) {
    // Not armed by a request: the default action.
    if (g_pending_request == 0) {
      signal(SIGALRM, SIG_DFL);
      raise(SIGALRM);
      return;
    }
    // The request was not taken up in time.
    signo = g_pending_request;
  } else if ((signo == SIGINT || signo == SIGTERM) && g_pending_request == 0) {
    g_pending_request = signo;
    alarm(static_cast<unsigned>(g_grace_seconds));
    return;
  }
  // A second signal while the first one is being reported (for example a
  // fault inside the log writer) ends the process at once.
  if (g_in_handler) _exit(signo);
  g_in_handler = 1;
  StopRunInSignalHandler(SignalMessage(signo, code), signo);
}

}  // namespace

void SetFlushToZero() {
#if defined(__SSE__)
  constexpr unsigned kFlushToZero = 0x8000;
  constexpr unsigned kDenormalsAreZero = 0x0040;
  _mm_setcsr(_mm_getcsr() | kFlushToZero | kDenormalsAreZero);
#endif
}

std::string_view SignalMessage(int signo, int fpe_code) {
  switch (signo) {
    case SIGABRT:
      return "Abnormal termination";
    case SIGILL:
      return "Illegal instruction";
    case SIGINT:
      return "Control-C send";
    case SIGSEGV:
      return "Illegal storage access";
    case SIGTERM:
      return "Termination request";
    case SIGFPE:
      switch (fpe_code) {
        case FPE_FLTUND:
          return "";
        case FPE_FLTINV:
          return "Floating point exception: Invalid number";
        case FPE_FLTDIV:
          return "Floating point exception: Zero divide";
        case FPE_FLTOVF:
          return "Floating point exception: Overflow";
        case FPE_FLTRES:
          return "Floating point exception: Inexact precision";
        default:
          return "Floating point exception: Non-IEEE type";
      }
    default:
      return "";
  }
}

void InstallSignalHandlers(unsigned grace_seconds) {
  g_grace_seconds = static_cast<std::sig_atomic_t>(grace_seconds);
  struct sigaction action {};
  action.sa_sigaction = HandleSignal;
  action.sa_flags = SA_SIGINFO;
  sigemptyset(&action.sa_mask);
  for (const int signo : kHandledSignals) sigaddset(&action.sa_mask, signo);
  for (const int signo : kHandledSignals) sigaction(signo, &action, nullptr);
}

void StopIfSignalled() {
  const int signo = g_pending_request;
  if (signo == 0) return;
  alarm(0);
  g_in_handler = 1;
  StopRun(SignalMessage(signo, 0), signo);
}

}  // namespace vhd
