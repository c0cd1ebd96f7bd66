#include "LineStream.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "MultiByte.h"

namespace sm {

std::size_t TextLineSource::ReadBlock(char* buffer, std::size_t size) {
    std::size_t count = std::min(size, text.size() - offset);
    std::memcpy(buffer, text.data() + offset, count);
    offset += count;
    return count;
}

bool LineStream::Refill() {
    if (sourceEnded) return false;
    position = 0;
    filled = source.ReadBlock(block.data(), block.size());
    if (filled == 0) sourceEnded = true;
    return filled != 0;
}

std::string_view LineStream::Finish(std::string_view line) {
    if (line.size() <= maxLineBytes) return line;
    return line.substr(0, multibyte::WholeCharPrefix(line.substr(0, maxLineBytes + 1), maxLineBytes));
}

namespace {
// Position of the first line-end byte (LF, CR, NUL) in [from, to), or to.
inline std::size_t FindLineEnd(const char* bytes, std::size_t from, std::size_t to) {
    for (std::size_t i = from; i < to; ++i) {
        auto byte = static_cast<unsigned char>(bytes[i]);
        if (byte <= '\r' && (byte == '\n' || byte == '\r' || byte == '\0')) return i;
    }
    return to;
}
}  // namespace

bool LineStream::ReadLine(std::string_view& line) {
    carried.clear();
    bool started = false;
    for (;;) {
        if (position == filled && !Refill()) {
            // The last line of a text need not have a line end.
            if (!started) return false;
            line = Finish(carried);
            return true;
        }
        if (pairedEnd != 0) {
            char expected = std::exchange(pairedEnd, 0);
            if (block[position] == expected) {
                ++position;
                continue;
            }
        }
        std::size_t end = FindLineEnd(block.data(), position, filled);
        std::string_view segment(block.data() + position, end - position);
        if (end < filled) {
            char ending = block[end];
            pairedEnd = ending == '\r' ? '\n' : ending == '\n' ? '\r' : 0;
            position = end + 1;
            if (!started) {
                // The usual case: the whole line lies in this block and needs no copy.
                line = Finish(segment);
                return true;
            }
            carried.append(segment.substr(0, maxLineBytes + 1 - std::min(carried.size(), maxLineBytes + 1)));
            line = Finish(carried);
            return true;
        }
        started = true;
        carried.append(segment.substr(0, maxLineBytes + 1 - std::min(carried.size(), maxLineBytes + 1)));
        position = filled;
    }
}

bool LineStream::ReadLine(String& line) {
    std::string_view view;
    if (!ReadLine(view)) return false;
    line.Assign(view);
    return true;
}

}  // namespace sm
