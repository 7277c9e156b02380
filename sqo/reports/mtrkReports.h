// The four memory reports and their heading printers.
#pragma once

#include <cstdint>

struct MtrkOptions;

int32_t mtrkInstanceReport(const MtrkOptions* options);
int32_t mtrkDatabaseReport(const MtrkOptions* options);
int32_t mtrkApplicationReport(const MtrkOptions* options);
int32_t mtrkPrivateMemoryReport(const MtrkOptions* options);

int32_t mtrkPrintNotice(uint32_t messageNumber);
int32_t mtrkPrintHeading(uint32_t messageNumber, const char* text);
// Prints `messageNumber` with the u32 of `numberElement` in the region as
// its insert ("%u"), traced under `functionId`; 1 when the element is missing.
int32_t mtrkPrintNumberedHeading(uint32_t functionId, uint16_t numberElement,
                                 uint32_t messageNumber, const char* start, uint32_t length);
int32_t mtrkPrintApplicationHeading(const char* start, uint32_t length);
int32_t mtrkPrintPrivateMemoryHeading(const char* start, uint32_t length);
