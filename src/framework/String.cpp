#include "String.h"

#include <algorithm>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "DebugOutput.h"
#include "CodePage.h"
#include "MultiByte.h"
#include "TEException.h"

namespace sm {

// ---- String -------------------------------------------------------------------------------------

std::size_t String::Size() const {
    if (cachedSize < 0) cachedSize = static_cast<std::int64_t>(std::strlen(Data())) + 1;
    return static_cast<std::size_t>(cachedSize - 1);
}

std::size_t String::CharCount() const { return multibyte::CharCount(View()); }

String& String::Assign(const char* text) { return Assign(std::string_view(text ? text : "")); }

String& String::Assign(std::string_view text) {
    // The text may point into our own storage (Mid of ourselves, say): copy before overwriting.
    if (text.data() >= Data() && text.data() <= Data() + Size()) {
        std::string copy(text);
        Splice(0, Size(), copy);
    } else {
        Splice(0, Size(), text);
    }
    return *this;
}

String& String::Assign(const String& text) {
    if (&text != this) Assign(text.View());
    return *this;
}

String& String::AssignChars(const char* text, std::size_t charCount) {
    std::string_view whole(text ? text : "");
    return Assign(whole.substr(0, multibyte::BytesOfChars(whole, charCount)));
}

String& String::AssignBytes(const char* text, std::size_t byteCount) {
    std::string_view whole(text ? text : "");
    return Assign(whole.substr(0, multibyte::WholeCharPrefix(whole, byteCount)));
}

String& String::Append(const char* text) { return Append(std::string_view(text ? text : "")); }

String& String::Append(std::string_view text) {
    if (text.data() >= Data() && text.data() <= Data() + Size()) {
        std::string copy(text);
        Splice(Size(), 0, copy);
    } else {
        Splice(Size(), 0, text);
    }
    return *this;
}

String& String::AppendInteger(std::int64_t value, const char* format) { return Append(FormatInteger(value, format)); }

String& String::AppendUnsigned(std::uint64_t value, const char* format) {
    return Append(FormatInteger(static_cast<std::int64_t>(value), format));
}

String& String::AppendDouble(double value, const char* format) { return Append(FormatDouble(value, format)); }

char* String::GetWritableText() {
    ForgetSize();
    return WritableData();
}

int String::Compare(std::string_view text, bool ignoreCase) const {
    return multibyte::Compare(View(), text, ignoreCase);
}

int String::Compare(std::string_view text, bool ignoreCase, std::size_t charCount, std::size_t startChar) const {
    std::string_view mine = View().substr(multibyte::ByteOffset(View(), startChar));
    mine = mine.substr(0, multibyte::BytesOfChars(mine, charCount));
    text = text.substr(0, multibyte::BytesOfChars(text, charCount));
    return multibyte::Compare(mine, text, ignoreCase);
}

bool String::BeginsWith(std::string_view text, bool ignoreCase) const {
    return Compare(text, ignoreCase, multibyte::CharCount(text)) == 0;
}

bool String::Find(std::string_view text, std::size_t startChar, bool ignoreCase, std::size_t* foundChar) const {
    std::string_view mine = View();
    std::size_t startByte = multibyte::ByteOffset(mine, startChar);
    std::size_t offset;
    if (ignoreCase) {
        std::string loweredMine = multibyte::ToLower(mine), loweredText = multibyte::ToLower(text);
        offset = multibyte::FindBytes(loweredMine, loweredText, startByte);
    } else {
        offset = multibyte::FindBytes(mine, text, startByte);
    }
    if (offset == std::string_view::npos) return false;
    if (foundChar) *foundChar = multibyte::CharCount(mine.substr(0, offset));
    return true;
}

void String::Insert(std::string_view text, std::size_t charPosition) {
    std::string copy(text);
    Splice(multibyte::ByteOffset(View(), charPosition), 0, copy);
}

void String::Delete(std::size_t charPosition, std::int64_t charCount) {
    std::string_view mine = View();
    std::size_t start = multibyte::ByteOffset(mine, charPosition);
    std::size_t length = charCount < 0 ? mine.size() - start
                                       : multibyte::BytesOfChars(mine.substr(start), static_cast<std::size_t>(charCount));
    Splice(start, length, {});
}

void String::Mid(std::size_t charPosition, std::int64_t charCount, String& target) const {
    std::string_view mine = View();
    std::string_view rest = mine.substr(multibyte::ByteOffset(mine, charPosition));
    if (charCount >= 0) rest = rest.substr(0, multibyte::BytesOfChars(rest, static_cast<std::size_t>(charCount)));
    target.Assign(rest);
}

void String::Trim() {
    std::string_view mine = View();
    std::string_view kept = multibyte::Trimmed(mine);
    std::size_t start = static_cast<std::size_t>(kept.data() - mine.data());
    std::size_t end = start + kept.size();
    if (end < mine.size()) Splice(end, mine.size() - end, {});
    if (start > 0) Splice(0, start, {});
}

bool String::ReplaceFirst(std::string_view pattern, std::string_view replacement, bool ignoreCase) {
    std::size_t foundChar = 0;
    if (!Find(pattern, 0, ignoreCase, &foundChar)) return false;
    std::size_t offset = multibyte::ByteOffset(View(), foundChar);
    std::string copy(replacement);
    Splice(offset, pattern.size(), copy);
    return true;
}

void String::ReplaceArg(int argumentNumber, std::string_view value) {
    std::string placeholder(1, '%');
    placeholder += std::to_string(argumentNumber);
    if (!ReplaceFirst(placeholder, value, false)) HandleMissingFormatArgument(placeholder, value);
}

void String::ReplaceArg(int argumentNumber, std::int64_t value, const char* format) {
    ReplaceArg(argumentNumber, std::string_view(FormatInteger(value, format)));
}

void String::HandleMissingFormatArgument(std::string_view placeholder, std::string_view value) {
    std::string tail = " COULD NOT FIND ";
    tail.append(placeholder).append("TO REPLACE WITH ").append(value).append(" ");
    Append(std::string_view(tail));
    if (GetDebugOutputLevel() > 0) {
        std::string warning = "WARNING! 'Could not find argument to replace in string' Line ";
        warning += std::to_string(__LINE__);
        warning += " in function String::HandleMissingFormatArgument in file ";
        warning += BaseFileName(__FILE__);
        warning += "\nCompilation Date: ";
        warning += __DATE__;
        warning += " Compilation Time: ";
        warning += __TIME__;
        warning += "\n";
        WriteDebugOutput(warning);
    }
}

// ---- CopyOnWriteMemory --------------------------------------------------------------------------

CopyOnWriteMemory* CopyOnWriteMemory::GlobalEmpty() {
    static CopyOnWriteMemory* const empty = [] {
        static char nul[1] = {'\0'};
        auto* memory = new CopyOnWriteMemory();
        memory->bytes = nul;
        memory->capacityBytes = 1;
        memory->references.store(2);
        memory->isGlobal = true;
        return memory;
    }();
    return empty;
}

CopyOnWriteMemory* CopyOnWriteMemory::Create(std::size_t capacity) {
    auto* memory = new (std::nothrow) CopyOnWriteMemory();
    if (!memory) TE_RAISE(TE_OUT_OF_MEMORY, "CopyOnWriteMemory::ResizeBuffer");
    try {
        memory->ResizeBuffer(capacity, true, false);
    } catch (...) {
        delete memory;
        throw;
    }
    memory->bytes[0] = '\0';
    return memory;
}

CopyOnWriteMemory::~CopyOnWriteMemory() {
    if (!isGlobal) std::free(bytes);
}

void CopyOnWriteMemory::Release() {
    if (isGlobal) return;
    if (references.fetch_sub(1) == 1) delete this;
}

void CopyOnWriteMemory::ResizeBuffer(std::size_t byteCount, bool exact, bool keepContents) {
    if (byteCount <= capacityBytes && bytes) return;
    std::size_t wanted = exact ? byteCount : byteCount + 4 + byteCount / 32;
    wanted = (wanted + 3) & ~static_cast<std::size_t>(3);
    if (wanted == 0) wanted = 4;
    char* grown = keepContents && bytes ? static_cast<char*>(std::realloc(bytes, wanted))
                                        : static_cast<char*>(std::malloc(wanted));
    if (!grown) TE_RAISE(TE_OUT_OF_MEMORY, "CopyOnWriteMemory::ResizeBuffer");
    if (!keepContents) std::free(bytes);
    bytes = grown;
    capacityBytes = wanted;
}

// ---- DynamicString ------------------------------------------------------------------------------

DynamicString::DynamicString() : buffer(CopyOnWriteMemory::GlobalEmpty()) {}

DynamicString::DynamicString(const DynamicString& other) : String(), buffer(other.buffer) {
    buffer->AddReference();
}

DynamicString::~DynamicString() { buffer->Release(); }

String& DynamicString::Assign(const String& text) {
    if (&text == this) return *this;
    if (auto* dynamic = dynamic_cast<const DynamicString*>(&text)) {
        // Sharing is the whole point: copies are constant time until somebody writes.
        dynamic->buffer->AddReference();
        buffer->Release();
        buffer = dynamic->buffer;
        ForgetSize();
        return *this;
    }
    return String::Assign(text.View());
}

void DynamicString::MakeWritable(std::size_t neededBytes) {
    if (buffer->ReferenceCount() != 1 || buffer == CopyOnWriteMemory::GlobalEmpty()) {
        std::size_t size = Size();
        CopyOnWriteMemory* own = CopyOnWriteMemory::Create(std::max(neededBytes, size + 1));
        std::memcpy(own->Bytes(), buffer->Bytes(), size + 1);
        buffer->Release();
        buffer = own;
    } else {
        buffer->ResizeBuffer(neededBytes, false, true);
    }
}

void DynamicString::Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) {
    std::size_t size = Size();
    if (byteOffset > size) byteOffset = size;
    if (removeBytes > size - byteOffset) removeBytes = size - byteOffset;
    std::size_t newSize = size - removeBytes + insert.size();
    if (newSize == 0 && size == 0) return;
    MakeWritable(newSize + 1);
    char* data = buffer->Bytes();
    std::memmove(data + byteOffset + insert.size(), data + byteOffset + removeBytes, size - byteOffset - removeBytes + 1);
    if (!insert.empty()) std::memcpy(data + byteOffset, insert.data(), insert.size());
    ForgetSize();
}

char* DynamicString::WritableData() {
    MakeWritable(Size() + 1);
    return buffer->Bytes();
}

std::size_t DynamicString::Reserve(std::size_t byteCount) {
    MakeWritable(byteCount + 1);
    return GetCapacity();
}

// ---- BufferString and StaticString helpers --------------------------------------------------------

void StoreWholeChars(char* destination, std::size_t capacity, std::string_view text) {
    std::size_t kept = multibyte::WholeCharPrefix(text, capacity);
    std::memmove(destination, text.data(), kept);
    destination[kept] = '\0';
}

char* BufferString::WritableData() {
    if (capacity == 0) TE_RAISE(TE_PROGRAM_ERROR, "BufferString::GetWritableText");
    return buffer;
}

void BufferString::Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) {
    if (capacity == 0) TE_RAISE(TE_PROGRAM_ERROR, "BufferString::Splice");
    std::string result(View());
    result.replace(byteOffset, removeBytes, insert);
    StoreWholeChars(buffer, capacity, result);
    ForgetSize();
}

// ---- number formatting ----------------------------------------------------------------------------

namespace {
// Widens the conversion of a one-conversion printf format to 64 bits ("%08x" -> "%08llx").
std::string WidenIntegerFormat(const char* format) {
    std::string widened(format ? format : "%d");
    std::size_t conversion = widened.find_last_of("diuxXo");
    if (conversion == std::string::npos) return "%lld";
    std::size_t modifiers = conversion;
    while (modifiers > 0 && std::strchr("hlLqjzt", widened[modifiers - 1])) --modifiers;
    widened.replace(modifiers, conversion - modifiers, "ll");
    return widened;
}
}  // namespace

std::string FormatInteger(std::int64_t value, const char* format) {
    std::string widened = WidenIntegerFormat(format);
    char text[128];
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    int length = std::snprintf(text, sizeof text, widened.c_str(), static_cast<long long>(value));
#pragma GCC diagnostic pop
    return length < 0 ? std::string() : std::string(text, std::min<std::size_t>(length, sizeof text - 1));
}

std::string FormatDouble(double value, const char* format) {
    char text[512];
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    int length = std::snprintf(text, sizeof text, format ? format : "%.13g", value);
#pragma GCC diagnostic pop
    return length < 0 ? std::string() : std::string(text, std::min<std::size_t>(length, sizeof text - 1));
}

}  // namespace sm
