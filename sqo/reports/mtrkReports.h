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
int32_t mtrkPrintApplicationHeading(const char* start, uint32_t length);
int32_t mtrkPrintPrivateMemoryHeading(const char* start, uint32_t length);
