#pragma once

#include "b_attribute.h"

#include <span>

/// The JSON form of attributes: its writer and its reader.
///
/// Plain values stand for attributes of the plain types: true and false for a bool, text for a
/// string, a number without fraction for an i32, any other number for a float, an array for an
/// `AttribArray` (null is a gap) and an object for an `AttribMap`. Everything else, and whatever
/// has flags, is an object with the members "@type", "@flags" if they are not 0, and "@value".
/// Members of a map are sorted by text; a name that starts with "@" gets a second one, a map's own
/// type is the member "@map". An array has the own type of its first map, or tells it as "@of".
namespace base {

class IPlugin;
class PluginFactory;

/// The types of numbers that go through `DataWriter` and `DataReader`.
enum class NumberType : u8 { int8, uint8, int16, uint16, int32, uint32, int64, real32, real64 };

template <class T>
constexpr NumberType numberTypeOf() {
    if constexpr (std::is_same_v<T, float>)
        return NumberType::real32;
    else if constexpr (std::is_same_v<T, double>)
        return NumberType::real64;
    else if constexpr (std::is_same_v<T, i64>)
        return NumberType::int64;
    else {
        static_assert(std::is_integral_v<T> && !std::is_same_v<T, bool> && sizeof(T) <= 4);
        constexpr int size = sizeof(T) == 4 ? 4 : sizeof(T) == 2 ? 2 : 0;
        return static_cast<NumberType>(size + (std::is_unsigned_v<T> ? 1 : 0));
    }
}

enum class DataLayout : u8 {
    lines, ///< each member or element on a line of its own
    flow,  ///< as many in a line as fit
};

/// Takes a document value by value. Within an object each value follows its name.
class BASE1_API DataWriter {
public:
    virtual ~DataWriter();
    virtual void beginObject(DataLayout layout = DataLayout::lines) = 0;
    virtual void endObject() = 0;
    virtual void beginArray(DataLayout layout = DataLayout::lines) = 0;
    virtual void endArray() = 0;
    /// Name of the next value; valid UTF-8.
    virtual void name(string_view text) = 0;
    virtual void null() = 0;
    virtual void boolean(bool value) = 0;
    /// Valid UTF-8, which may hold zero bytes.
    virtual void text(string_view value) = 0;
    /// A real number that shows that it is one: it has a fraction or an exponent, or is NaN or
    /// infinite.
    virtual void real(float value) = 0;
    /// Any number of values within an array, else one. Reals that are whole may look like
    /// integers.
    template <class T>
    void numbers(std::span<const T> values) {
        writeNumbers(numberTypeOf<T>(), values.data(), values.size());
    }
    template <class T>
    void number(T value) {
        writeNumbers(numberTypeOf<T>(), &value, 1);
    }

protected:
    virtual void writeNumbers(NumberType type, const void* values, std::size_t count) = 0;
};

/// What a reader stands at.
enum class DataKind : u8 { end, name, null, boolean, integer, real, text, array, object };

/// A member of an object, with what its value is.
struct DataMember {
    string_view name;
    string_view text; ///< of the value if that is one
    u32 place = 0;    ///< of the value
    DataKind kind = DataKind::end;
};

/// Walks over a document. A new one stands at its only value.
class BASE1_API DataReader {
public:
    virtual ~DataReader();
    /// `end` behind the last value of an array, object or document.
    virtual DataKind kind() const = 0;
    /// Steps over the name or the whole value here. Does nothing at an end.
    virtual void skip() = 0;
    /// Steps into the array or object here.
    virtual void enter() = 0;
    /// Steps out of the array or object at whose end the reader stands.
    virtual void leave() = 0;
    /// Steps over the member here, which `member` is then; false at the end of the object.
    virtual bool nextMember(DataMember& member) = 0;
    /// Values of the array or members of the object here.
    virtual u32 length() const = 0;
    /// The name or text here; good for as long as the reader is.
    virtual string_view text() const = 0;
    /// The boolean here.
    virtual bool boolean() const = 0;
    /// Reads as many numbers, from here on, and steps behind them. False, and somewhere among
    /// them, if one is none or out of the range of T: for `float` that of its finite values,
    /// and NaN.
    template <class T>
    bool numbers(std::span<T> values) {
        return readNumbers(numberTypeOf<T>(), values.data(), values.size());
    }
    template <class T>
    bool number(T& value) {
        return readNumbers(numberTypeOf<T>(), &value, 1);
    }

    /// Where the reader stands, to come back to.
    virtual u32 place() const = 0;
    virtual void setPlace(u32 place) = 0;
    /// Line of the text, from 1, and the name of its source, both for messages.
    virtual u32 line() const = 0;
    virtual const string& source() const = 0;

protected:
    virtual bool readNumbers(NumberType type, void* values, std::size_t count) = 0;
};

/// Writes indented JSON to a stream, in blocks; throws `exception` for a text that is longer than
/// the 1 GiB that a reader takes. NaN and infinite numbers are written as NaN,
/// Infinity and -Infinity.
class BASE1_API JSONAttrWriter final : public DataWriter {
public:
    explicit JSONAttrWriter(Stream& stream);
    ~JSONAttrWriter() override;
    /// Ends the last line and writes what is pending.
    void finish();

    void beginObject(DataLayout layout = DataLayout::lines) override;
    void endObject() override;
    void beginArray(DataLayout layout = DataLayout::lines) override;
    void endArray() override;
    void name(string_view text) override;
    void null() override;
    void boolean(bool value) override;
    void text(string_view value) override;
    void real(float value) override;

protected:
    void writeNumbers(NumberType type, const void* values, std::size_t count) override;

private:
    struct Level {
        DataLayout layout;
        bool isEmpty = true;
    };
    void begin(char bracket, DataLayout layout);
    void end(char bracket);
    void separate();
    void newLine();
    bool isLineFull() const;
    void flush();
    void require(std::size_t byteCount) {
        if (static_cast<std::size_t>(blockEnd_ - at_) < byteCount)
            flush();
    }
    void put(string_view text);
    void putQuoted(string_view text);
    template <class T>
    void putNumbers(const T* values, std::size_t count);

    Stream& stream_;
    vector<Level> levels_;
    bool hasName_ = false; ///< the next value belongs to a name that has been written
    std::unique_ptr<char[]> block_;
    char* at_;
    char* blockEnd_;
    i64 lineStart_ = 0; ///< of the line being written, as an offset from the block's start
    u64 written_ = 0;   ///< bytes in front of the block
};

/// Reads a whole text at `open` and walks over it.
class BASE1_API JSONAttrReader final : public DataReader {
public:
    JSONAttrReader();
    ~JSONAttrReader() override;
    /// Takes the text from the stream's position to its end; at most 1 GiB. False, with a message
    /// in the log, if it is no JSON.
    bool open(Stream& stream);

    DataKind kind() const override;
    void skip() override;
    void enter() override;
    void leave() override;
    bool nextMember(DataMember& member) override;
    u32 length() const override;
    string_view text() const override;
    bool boolean() const override;
    u32 place() const override;
    void setPlace(u32 place) override;
    u32 line() const override;
    const string& source() const override { return source_; }

protected:
    bool readNumbers(NumberType type, void* values, std::size_t count) override;

private:
    struct Content;
    std::unique_ptr<Content> content_;
    string source_;
};

/// What writing attributes needs to know; what is left at its default is not used.
struct JSONWriteOptions {
    /// Objects of another factory can't be referred to. Null: of any, by their ids.
    const PluginFactory* factory = nullptr;
    /// By the object's id: the name that it alone has and that stands for it, null without one.
    vector<const string*> uniqueNames;
    // For messages: the object that is being written, and its attribute.
    string owner;
    name_id attribute;
    u32 depth = 0; ///< of maps and arrays in each other
};

/// What reading attributes needs to know.
struct JSONReadOptions {
    static constexpr u32 severalObjects = 1u << 31;

    AttribFactory* attribFactory = &base::attribFactory();
    /// The objects by their place in the document, null for those that are not there.
    vector<ref<IPlugin>> objects;
    u32 firstId = 0; ///< of the object at place 0
    /// First place of an object with that name; with `severalObjects` if there are more.
    hash_map<string_view, u32> placeOfName;
    string owner;
    name_id attribute;
    u32 depth = 0;
};

/// Reads the value that `in` stands at, in either form, and steps behind it. Null, with a message
/// in the log, if it is none. The caller owns the result. Throws `exception` if maps and arrays
/// lie in each other deeper than 256 levels.
BASE1_API Attribute* readJsonAttribute(DataReader& in, JSONReadOptions& options);

} // namespace base
