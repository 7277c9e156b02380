#include "sqlomtrk.h"

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>

#include "engine/vrxapp.h"
#include "engine/vrxsys.h"
#include "messages/mtrkMessages.h"
#include "messages/mtrkTrace.h"
#include "mtrkInternalPools.h"
#include "mtrkOptions.h"
#include "platform.h"
#include "reports/mtrkReports.h"

using MtrkSignalDisposition = void (*)(int);

// The dispositions that were in force before the run installed its handler;
// the defaults until then, so that shutdown can put them back on any path.
MtrkSignalDisposition gPrevSigIntHandler = SIG_DFL;
MtrkSignalDisposition gPrevSigTermHandler = SIG_DFL;
MtrkSignalDisposition gPrevSigHupHandler = SIG_DFL;
MtrkSignalDisposition gPrevSigPipeHandler = SIG_DFL;

namespace {

constexpr uint64_t MTRK_MS_PER_SECOND = 1000;

// A hang-up or broken pipe that the caller chose to ignore (nohup, a shell
// that ignores SIGPIPE) stays ignored: the run then ends through its own
// checks and restores at shutdown.
MtrkSignalDisposition mtrkInstallUnlessIgnored(int signalNumber) {
    MtrkSignalDisposition previous = signal(signalNumber, mtrkSignalHandler);
    if (previous == SIG_IGN) {
        signal(signalNumber, SIG_IGN);
    }
    return previous;
}

void mtrkInstallSignalHandlers(void) {
    gPrevSigIntHandler = signal(SIGINT, mtrkSignalHandler);
    gPrevSigTermHandler = signal(SIGTERM, mtrkSignalHandler);
    gPrevSigHupHandler = mtrkInstallUnlessIgnored(MTRK_SIGNAL_HANGUP);
    gPrevSigPipeHandler = mtrkInstallUnlessIgnored(MTRK_SIGNAL_BROKEN_PIPE);
}

// A disposition that signal() refused is not put back.
void mtrkPutBackDisposition(int signalNumber, MtrkSignalDisposition previous) {
    if (previous != SIG_ERR) {
        signal(signalNumber, previous);
    }
}

// Output that could not be written (a full disk, a closed file) must not
// end in success.
int32_t mtrkFlushOutput(void) {
    errno = 0;
    if (fflush(stdout) == 0 && ferror(stdout) == 0) {
        return 0;
    }
    const int32_t code = errno != 0 ? errno : EIO;
    return mtrkLogFailure(MTRK_FID_MAIN, MTRK_PROBE_100, "Error in call to fflush.\nrc=", code,
                          true);
}

int32_t mtrkRunRepetition(const MtrkOptions* options) {
    int32_t result = mtrkPrintTimestamp();
    if (result == 0 && options->instance == 1) {
        result = mtrkInstanceReport(options);
    }
    if (result == 0 && options->database == 1) {
        result = mtrkDatabaseReport(options);
    }
    if (result == 0 && options->application == 1) {
        result = mtrkApplicationReport(options);
    }
    if (result == 0 && options->privateMemory == 1) {
        result = mtrkPrivateMemoryReport(options);
    }
    if (result == 0) {
        result = mtrkFlushOutput();
    }
    return result;
}

int32_t mtrkRunReportLoop(const MtrkOptions* options) {
    int32_t result = 0;
    // 64 bits, so that the last of 2147483647 repetitions does not overflow.
    for (int64_t repetition = 1; result == 0 && repetition <= options->count; ++repetition) {
        result = mtrkRunRepetition(options);
        if (result == 0 && repetition < options->count) {
            // In 64 bits: a long interval must not wrap into a short wait.
            Sleep(static_cast<uint64_t>(options->interval) * MTRK_MS_PER_SECOND);
        }
    }
    return result;
}

// Sets the registry variable for the run. The signals stay held until the
// flag says that a restore is due, so that no signal can end the run with
// the variable set and the flag still clear.
int32_t mtrkExposeForRun(void) {
    mtrkBlockRunSignals();
    const int32_t result = mtrkExposeInternalPools(gSavedMemTrk);
    if (result == 0) {
        gMemTrkChanged = 1;
    }
    mtrkUnblockRunSignals();
    return result;
}

// Runs everything between a ready environment and shutdown.
int32_t mtrkRun(int32_t argc, const char* const* argv) {
    mtrkInstallSignalHandlers();

    MtrkOptions options;
    mtrkSetDefaultOptions(&options);
    int32_t result = mtrkParseOptions(argc, argv, &options);
    if (result == 0 && options.allPools == 1) {
        result = mtrkExposeForRun();
    }
    if (result == 0) {
        result = options.help == 1 ? mtrkPrintHelp(&options) : mtrkRunReportLoop(&options);
    }
    if (result == 0) {
        result = mtrkFlushOutput();
    }
    return result;
}

// Puts back what the run changed. The signals are held meanwhile: once the
// old dispositions are back, a signal would no longer restore the registry,
// and one that came before the restore finished would leave it set.
void mtrkShutdown(void) {
    mtrkBlockRunSignals();
    mtrkPutBackDisposition(SIGINT, gPrevSigIntHandler);
    mtrkPutBackDisposition(SIGTERM, gPrevSigTermHandler);
    mtrkPutBackDisposition(MTRK_SIGNAL_HANGUP, gPrevSigHupHandler);
    mtrkPutBackDisposition(MTRK_SIGNAL_BROKEN_PIPE, gPrevSigPipeHandler);
    if (gMemTrkChanged == 1) {
        (void)mtrkRestoreInternalPools(gSavedMemTrk);
    }
    mtrkUnblockRunSignals();
}

}  // namespace

int32_t mtrkPrintTimestamp(void) {
    SqloDateTime now;
    memset(&now, 0, sizeof now);
    const int32_t rc = sqlogetdatetime(&now);
    if (rc != 0) {
        return mtrkLogFailure(MTRK_FID_PRINT_TIMESTAMP, MTRK_PROBE_50,
                              "Error in call to sqlogetdatetime.\nrc=", rc, true);
    }

    char date[MTRK_NUMBER_SIZE];
    char time[MTRK_NUMBER_SIZE];
    snprintf(date, sizeof date, "%04d/%02d/%02d", static_cast<int>(now.year),
             static_cast<int>(now.month), static_cast<int>(now.day));
    snprintf(time, sizeof time, "%02d:%02d:%02d", static_cast<int>(now.hour),
             static_cast<int>(now.minute), static_cast<int>(now.second));

    char message[MTRK_TEXT_SIZE];
    const int32_t status = mtrkGetMessage(24, message, sizeof message, 2, date, time);
    if (status != 0) {
        return status;
    }
    printf("%s\n\n", message);
    return 0;
}

int32_t mtrkMain(int32_t argc, const char* const* argv) {
    gMemTrkChanged = 0;
    gLastRc = 0;
    const uint32_t traceFlags = mtrkTraceEntry(MTRK_FID_MAIN);

    int32_t result = sqleInitApplicationEnvironment(0, 0, 1, nullptr);
    if (result != 0) {
        result =
            mtrkLogFailure(MTRK_FID_MAIN, MTRK_PROBE_50,
                           "Error in call to sqleInitApplicationEnvironment.\nrc=", result, true);
    } else {
        result = mtrkRun(argc, argv);
    }

    mtrkShutdown();
    if (result == -4) {
        (void)mtrkReportLastFailure();
    }
    mtrkTraceExit(MTRK_FID_MAIN, traceFlags, result);
    return result;
}
