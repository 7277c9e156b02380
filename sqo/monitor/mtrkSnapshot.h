// Taking a snapshot from the engine's snapshot monitor, with retries.
#pragma once

#include <cstdint>

// Takes a snapshot of `objectType` (VRX_OBJ_*) into a block held in
// *buffer, which the caller releases with sqlofmblkEx whatever the result.
// *bufferSize receives the block's size (0 with no block), so that a stream
// is never read past what was allocated. Results: 0, -2 (nothing to report),
// -3 (explained by a printed message), -4 (recorded), 1606.
int32_t mtrkGetSnapshot(char** buffer, uint32_t objectType, uint32_t* bufferSize);

int32_t mtrkGetSnapshotSize(char** buffer, uint32_t* size, uint32_t objectType,
                            uint32_t multiplier);
int32_t mtrkTakeSnapshot(char* buffer, uint32_t size, uint32_t objectType);
int32_t mtrkMapMonitorCode(int32_t sqlCode);

// Releases a snapshot block (if any) and clears the pointer.
void mtrkReleaseSnapshot(char** buffer);
