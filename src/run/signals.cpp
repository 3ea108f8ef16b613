#include "run/signals.hpp"

#include <ucontext.h>

#include <csignal>

#include "run/messages.hpp"

namespace {

// Lets an underflow trap pass: the underflow exception is masked and its flag
// cleared in the interrupted context, so the instruction runs again and
// yields the flushed result.
bool PassUnderflow(void* context) {
#if defined(__x86_64__)
    auto* uc = static_cast<ucontext_t*>(context);
    if (uc == nullptr || uc->uc_mcontext.fpregs == nullptr) return false;
    uc->uc_mcontext.fpregs->mxcsr |= 0x0800u;   // underflow mask
    uc->uc_mcontext.fpregs->mxcsr &= ~0x0010u;  // underflow flag
    return true;
#else
    (void)context;
    return false;
#endif
}

void OnFloatingPoint(int signal, siginfo_t* info, void* context) {
    const int sub = FpeSubCode(info != nullptr ? info->si_code : 0);
    if (sub == kFpeUnderflow && PassUnderflow(context)) return;
    StopRun(FpeText(sub == kFpeUnderflow ? kFpeNonIeee : sub), signal);
}

void OnSignal(int signal) {
    switch (signal) {
        case SIGABRT:
            StopRun("Abnormal termination");
        case SIGILL:
            StopRun("Illegal instruction");
        case SIGINT:
            StopRun("Control-C send");
        case SIGSEGV:
            StopRun("Illegal storage access");
        case SIGTERM:
            StopRun("Termination request");
        default:
            StopRun("Termination request");
    }
}

}  // namespace

int FpeSubCode(int siCode) {
    switch (siCode) {
        case FPE_FLTINV:
            return kFpeInvalid;
        case FPE_FLTDIV:
            return kFpeZeroDivide;
        case FPE_FLTOVF:
            return kFpeOverflow;
        case FPE_FLTUND:
            return kFpeUnderflow;
        case FPE_FLTRES:
            return kFpeInexact;
        default:
            return kFpeNonIeee;  // integer faults, subscript range, signals sent by hand
    }
}

std::string FpeText(int subCode) {
    switch (subCode) {
        case kFpeInvalid:
            return "Floating point exception: Invalid number";
        case kFpeDenormal:
            return "Floating point exception: Denormalized number";
        case kFpeZeroDivide:
            return "Floating point exception: Zero divide";
        case kFpeOverflow:
            return "Floating point exception: Overflow";
        case kFpeUnderflow:
            return "";
        case kFpeInexact:
            return "Floating point exception: Inexact precision";
        default:
            return "Floating point exception: Non-IEEE type";
    }
}

void InstallSignalHandlers() {
    struct sigaction action = {};
    sigemptyset(&action.sa_mask);
    action.sa_handler = OnSignal;
    for (int signal : {SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM})
        sigaction(signal, &action, nullptr);

    struct sigaction fpe = {};
    sigemptyset(&fpe.sa_mask);
    fpe.sa_flags = SA_SIGINFO;
    fpe.sa_sigaction = OnFloatingPoint;
    sigaction(SIGFPE, &fpe, nullptr);
}
