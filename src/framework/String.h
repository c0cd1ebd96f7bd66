// The text type of the whole DLL: NUL-terminated multibyte text in the process's code page.
// Lengths and capacities are bytes; positions and counts are characters (a double-byte character is
// one). Three storage kinds share one interface: DynamicString (copy-on-write, unbounded),
// StaticString<N> (inline, silently cut to whole characters), BufferString (a caller's buffer).
#pragma once

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace sm {

class String {
public:
    virtual ~String() = default;
    String(const String&) = delete;
    String& operator=(const String&) = delete;

    const char* GetText() const { return Data(); }
    std::string_view View() const { return {Data(), Size()}; }
    // Byte length without the terminating NUL; measured once and cached until a raw write.
    std::size_t Size() const;
    std::size_t CharCount() const;
    bool IsEmpty() const { return Data()[0] == '\0'; }
    virtual std::size_t GetCapacity() const = 0;

    // A null text is the empty text.
    String& Assign(const char* text);
    String& Assign(std::string_view text);
    virtual String& Assign(const String& text);
    String& AssignChars(const char* text, std::size_t charCount);
    // Takes at most byteCount bytes, dropping a character that would be split.
    String& AssignBytes(const char* text, std::size_t byteCount);
    void Empty() { Splice(0, Size(), {}); }

    String& Append(const char* text);
    String& Append(std::string_view text);
    String& Append(const String& text) { return Append(text.View()); }
    // printf-style conversions "%d", "%u", "%x" (with any flags and width) on the full 64-bit value.
    String& AppendInteger(std::int64_t value, const char* format = "%d");
    String& AppendUnsigned(std::uint64_t value, const char* format = "%u");
    String& AppendDouble(double value, const char* format = "%.13g");

    // Writable access for callers that fill the text through a raw pointer; call ForgetSize after.
    char* GetWritableText();
    void ForgetSize() { cachedSize = -1; }
    // Makes room for byteCount bytes of text; gives the room obtained.
    virtual std::size_t Reserve(std::size_t byteCount) = 0;

    int Compare(std::string_view text, bool ignoreCase) const;
    int Compare(std::string_view text, bool ignoreCase, std::size_t charCount, std::size_t startChar = 0) const;
    bool BeginsWith(std::string_view text, bool ignoreCase) const;
    bool Find(std::string_view text, std::size_t startChar, bool ignoreCase, std::size_t* foundChar) const;

    void Insert(std::string_view text, std::size_t charPosition);
    // A negative count deletes to the end.
    void Delete(std::size_t charPosition, std::int64_t charCount);
    void Mid(std::size_t charPosition, std::int64_t charCount, String& target) const;
    void Trim();
    bool ReplaceFirst(std::string_view pattern, std::string_view replacement, bool ignoreCase);

    // Fills message placeholder "%n" (first occurrence only); a missing placeholder appends a tail.
    void ReplaceArg(int argumentNumber, std::string_view value);
    void ReplaceArg(int argumentNumber, const String& value) { ReplaceArg(argumentNumber, value.View()); }
    void ReplaceArg(int argumentNumber, const char* value) { ReplaceArg(argumentNumber, std::string_view(value ? value : "")); }
    void ReplaceArg(int argumentNumber, std::int64_t value, const char* format);

protected:
    String() = default;
    virtual const char* Data() const = 0;
    // The one write primitive: replace removeBytes bytes at byteOffset with insert. Kinds with a
    // fixed capacity cut the result to whole characters.
    virtual void Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) = 0;
    virtual char* WritableData() = 0;
    virtual void HandleMissingFormatArgument(std::string_view placeholder, std::string_view value);

private:
    mutable std::int64_t cachedSize = -1;
    friend class DynamicString;
};

// The shared buffer behind DynamicString. The global empty buffer is never freed.
class CopyOnWriteMemory {
public:
    static CopyOnWriteMemory* GlobalEmpty();
    static CopyOnWriteMemory* Create(std::size_t capacity);

    char* Bytes() { return bytes; }
    std::size_t Capacity() const { return capacityBytes; }
    std::uint32_t ReferenceCount() const { return references.load(); }
    void AddReference() { references.fetch_add(1); }
    void Release();
    // Growth rule: a request that fits changes nothing; otherwise n + 4 + n/32 (exact: n), rounded
    // up to a multiple of 4. Raises TE_OUT_OF_MEMORY on failure, leaving the buffer as it was.
    void ResizeBuffer(std::size_t byteCount, bool exact, bool keepContents);

private:
    CopyOnWriteMemory() = default;
    ~CopyOnWriteMemory();
    char* bytes = nullptr;
    std::size_t capacityBytes = 0;
    std::atomic<std::uint32_t> references{1};
    bool isGlobal = false;
};

class DynamicString final : public String {
public:
    DynamicString();
    DynamicString(const char* text) : DynamicString() { Assign(text); }
    DynamicString(std::string_view text) : DynamicString() { Assign(text); }
    DynamicString(const DynamicString& other);
    DynamicString(const String& other) : DynamicString() { Assign(other); }
    DynamicString& operator=(const DynamicString& other) { Assign(other); return *this; }
    DynamicString& operator=(std::string_view text) { String::Assign(text); return *this; }
    ~DynamicString() override;

    using String::Assign;
    String& Assign(const String& text) override;
    std::size_t GetCapacity() const override { return buffer->Capacity() ? buffer->Capacity() - 1 : 0; }
    std::size_t Reserve(std::size_t byteCount) override;
    // Exposed so tests and callers can see whether two strings share storage.
    const CopyOnWriteMemory* SharedBuffer() const { return buffer; }

protected:
    const char* Data() const override { return buffer->Bytes(); }
    void Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) override;
    char* WritableData() override;

private:
    void MakeWritable(std::size_t neededBytes);
    CopyOnWriteMemory* buffer;
};

// Fixed capacity of N bytes of text (plus the NUL); longer text is cut to whole characters.
template <std::size_t N>
class StaticString final : public String {
public:
    StaticString() { storage[0] = '\0'; }
    StaticString(const char* text) : StaticString() { Assign(text); }
    StaticString(std::string_view text) : StaticString() { Assign(text); }
    StaticString(const StaticString& other) : StaticString() { Assign(other.View()); }
    StaticString(const String& other) : StaticString() { Assign(other.View()); }
    StaticString& operator=(const StaticString& other) { Assign(other.View()); return *this; }
    StaticString& operator=(std::string_view text) { String::Assign(text); return *this; }
    using String::Assign;
    std::size_t GetCapacity() const override { return N; }
    std::size_t Reserve(std::size_t) override { return N; }

protected:
    const char* Data() const override { return storage; }
    char* WritableData() override { return storage; }
    void Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) override;

private:
    char storage[N + 1];
};

// A view over a caller's NUL-terminated buffer of a known capacity; writes are cut to fit.
class BufferString final : public String {
public:
    // A read-only view over a literal has capacity 0: writes to it are program errors.
    explicit BufferString(const char* text) : buffer(const_cast<char*>(text ? text : "")), capacity(0) {}
    BufferString(char* writable, std::size_t capacityBytes) : buffer(writable), capacity(capacityBytes) {}
    using String::Assign;
    std::size_t GetCapacity() const override { return capacity; }
    std::size_t Reserve(std::size_t) override { return capacity; }

protected:
    const char* Data() const override { return buffer; }
    char* WritableData() override;
    void Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) override;

private:
    char* buffer;
    std::size_t capacity;
};

// Cuts text to whole characters within capacity and writes it, NUL-terminated, into destination.
void StoreWholeChars(char* destination, std::size_t capacity, std::string_view text);

template <std::size_t N>
void StaticString<N>::Splice(std::size_t byteOffset, std::size_t removeBytes, std::string_view insert) {
    std::string result(View());
    result.replace(byteOffset, removeBytes, insert);
    StoreWholeChars(storage, N, result);
    ForgetSize();
}

using StringVector = std::vector<DynamicString>;

// Formats one 64-bit integer with a printf conversion such as "%d", "%u", "%x" or "%08X".
std::string FormatInteger(std::int64_t value, const char* format);
std::string FormatDouble(double value, const char* format);

}  // namespace sm
