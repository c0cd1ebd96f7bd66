// Splits text into lines the way INI documents are read. A line ends at LF, CR or NUL; a CR
// directly followed by LF (or an LF by a CR) is one line end, so files written on any platform give
// the same lines. The text is taken from its source in blocks of 2048 bytes, so a file of any size is
// read with one fixed buffer. A line keeps at most its first 640 bytes, cut back to whole characters
// so a double-byte character is never split; the rest of that line is dropped without error.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>

#include "String.h"

namespace sm {

// Where a LineStream takes its bytes from.
class LineSource {
public:
    virtual ~LineSource() = default;
    // Fills up to size bytes of buffer and gives how many; 0 means the text has ended. A source that
    // fails also gives 0 and keeps the failure for its owner to report.
    virtual std::size_t ReadBlock(char* buffer, std::size_t size) = 0;
};

// Text already in memory (a String or any byte range that outlives the stream).
class TextLineSource final : public LineSource {
public:
    explicit TextLineSource(std::string_view text) : text(text) {}
    std::size_t ReadBlock(char* buffer, std::size_t size) override;

private:
    std::string_view text;
    std::size_t offset = 0;
};

class LineStream {
public:
    static constexpr std::size_t blockBytes = 32768;
    static constexpr std::size_t maxLineBytes = 640;

    explicit LineStream(LineSource& source) : source(source) {}
    LineStream(const LineStream&) = delete;
    LineStream& operator=(const LineStream&) = delete;

    // The next line without its line end; false when the text has ended. The view stays valid
    // until the next call.
    bool ReadLine(std::string_view& line);
    // The same, copied into a String.
    bool ReadLine(String& line);

private:
    bool Refill();
    std::string_view Finish(std::string_view line);

    LineSource& source;
    std::array<char, blockBytes> block{};
    std::size_t position = 0;
    std::size_t filled = 0;
    bool sourceEnded = false;
    // After a CR the next byte may be its LF (and after an LF its CR); it may arrive in the next block.
    char pairedEnd = 0;
    // A line that crosses a block boundary. Holds one byte more than a line keeps, so the cut to
    // whole characters can see whether byte 640 starts a character or ends one.
    std::string carried;
};

}  // namespace sm
