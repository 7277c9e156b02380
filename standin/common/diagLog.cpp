#include "common/diagLog.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "common/instance.h"
#include "engine/vrxsys.h"

namespace standin {

namespace {

void appendHex(std::string& out, unsigned value, int digits) {
    static constexpr char kDigits[] = "0123456789abcdef";
    for (int shift = (digits - 1) * 4; shift >= 0; shift -= 4)
        out += kDigits[(value >> shift) & 0xF];
}

void appendEscaped(std::string& out, const unsigned char* text, uint64_t length) {
    out += '"';
    for (uint64_t i = 0; i < length; ++i) {
        unsigned char c = text[i];
        if (c == '\n') {
            out += "\\n";
        } else if (c == '"') {
            out += "\\\"";
        } else if (c == '\\') {
            out += "\\\\";
        } else if (c < 0x20 || c == 0x7F) {
            out += "\\x";
            appendHex(out, c, 2);
        } else {
            out += static_cast<char>(c);
        }
    }
    out += '"';
}

void appendItem(std::string& out, uint32_t number, const DiagItem& item) {
    out += "  data#" + std::to_string(number) + ' ';
    const auto* bytes = static_cast<const unsigned char*>(item.data);
    std::string length = '(' + std::to_string(item.length) + "): ";
    if (item.type == PD_ITEM_TEXT) {
        out += "text" + length;
        if (bytes == nullptr && item.length > 0) {
            out += "null";
        } else {
            appendEscaped(out, bytes, item.length);
        }
    } else if (item.type == PD_ITEM_INT32) {
        out += "int32" + length;
        if (bytes == nullptr || item.length < sizeof(int32_t)) {
            out += "null";
        } else {
            int32_t value;
            std::memcpy(&value, bytes, sizeof value);
            out += std::to_string(value);
        }
    } else {
        // A type this log does not know: its first bytes in hexadecimal, so
        // that the record still shows what was passed.
        out += "0x";
        appendHex(out, item.type, 8);
        out += length;
        if (bytes == nullptr) {
            out += "null";
        } else {
            uint64_t shown = item.length < 64 ? item.length : 64;
            for (uint64_t i = 0; i < shown; ++i) {
                if (i > 0)
                    out += ' ';
                appendHex(out, bytes[i], 2);
            }
            if (shown < item.length)
                out += " ...";
        }
    }
    out += '\n';
}

void writeAll(int fd, const std::string& text) {
    size_t done = 0;
    while (done < text.size()) {
        ssize_t n = write(fd, text.data() + done, text.size() - done);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0)
            return;
        done += static_cast<size_t>(n);
    }
}

}  // namespace

std::string formatDiagRecord(const std::tm& when, long microseconds, long pid, uint32_t functionId,
                             uint32_t probe, const DiagItem* items, uint32_t itemCount) {
    char head[128];
    std::snprintf(head, sizeof head,
                  "%04d-%02d-%02dT%02d:%02d:%02d.%06ld pid=%ld func=0x%08x probe=%u\n",
                  when.tm_year + 1900, when.tm_mon + 1, when.tm_mday, when.tm_hour, when.tm_min,
                  when.tm_sec, microseconds, pid, functionId, probe);
    std::string record = head;
    for (uint32_t i = 0; i < itemCount; ++i)
        appendItem(record, i + 1, items[i]);
    record += '\n';
    return record;
}

void appendDiagRecord(const char* dir, uint32_t functionId, uint32_t probe, const DiagItem* items,
                      uint32_t itemCount) {
    if (dir == nullptr || dir[0] == '\0')
        return;
    timeval now{};
    gettimeofday(&now, nullptr);
    std::tm when{};
    localtime_r(&now.tv_sec, &when);
    std::string record =
        formatDiagRecord(when, static_cast<long>(now.tv_usec), static_cast<long>(getpid()),
                         functionId, probe, items, itemCount);
    std::string path = std::string(dir) + "/diag.log";
    int fd = open(path.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644);
    if (fd < 0)
        return;
    // One write: O_APPEND makes it land whole at the end, whatever other
    // processes append at the same time.
    writeAll(fd, record);
    close(fd);
}

void logEngineProblem(std::string_view text, uint32_t probe) {
    char dir[PATH_MAX];
    if (!instanceDirectoryPath(dir, sizeof dir))
        return;
    DiagItem item{PD_ITEM_TEXT, text.size(), text.data()};
    appendDiagRecord(dir, 0, probe, &item, 1);
}

}  // namespace standin
