// The few platform specifics of the program. The engine's own platform
// spells a signed 64-bit decimal "%I64d" and waits with Sleep(milliseconds);
// this header gives the same behaviour through the C and POSIX runtimes.
#pragma once

#include <cinttypes>
#include <csignal>
#include <cstdint>

// printf conversion of a signed 64-bit decimal.
#define MTRK_I64D "%" PRId64

// Waits the given number of milliseconds in full, also across interruptions
// by signals whose handlers return.
void Sleep(uint64_t milliseconds);

// Besides an interrupt and a termination request, a closed terminal and a
// closed output pipe end a run here the way a console interrupt ends it
// elsewhere, so the run driver handles them alike.
constexpr int MTRK_SIGNAL_HANGUP = SIGHUP;
constexpr int MTRK_SIGNAL_BROKEN_PIPE = SIGPIPE;

// Holds SIGINT, SIGTERM, SIGHUP and SIGPIPE pending, so that a stretch of
// code that must not be cut short (a registry change and the flag that
// records it) runs to its end first. mtrkUnblockRunSignals puts back the
// signal mask that the last mtrkBlockRunSignals found, and a held signal is
// delivered then. Both are async-signal-safe.
void mtrkBlockRunSignals(void);
void mtrkUnblockRunSignals(void);
