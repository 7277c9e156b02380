// Exposure of the engine's internal pools for a run (-all) and the signal
// handler that puts the registry variable back when a signal ends the run.
#pragma once

#include <cstdint>

#include "engine/vrxsys.h"

// Room for the largest value the registry holds, terminator included.
constexpr uint32_t MTRK_SAVED_MEMTRK_SIZE = SQLO_REG_VALUE_MAX + 1;

extern char gSavedMemTrk[MTRK_SAVED_MEMTRK_SIZE];
extern volatile uint8_t gMemTrkChanged;

int32_t mtrkPartitionNumber(void);
int32_t mtrkExposeInternalPools(char* saved);
int32_t mtrkRestoreInternalPools(const char* saved);
void mtrkSignalHandler(int signalNumber);
