#pragma once

#include "b_attribute_path.h"
#include "b_type_traits.h"

/// The attribute classes: named typed values with flags. Their container is in
/// `b_attribute_map.h`.
///
/// An attribute is owned by exactly one map or array and dies with it. Reads are not locked;
/// the lock of an attribute guards only the chain of weak links that point at it.
namespace base {

class AttribArray;
class AttribLink;
class AttribMap;
class DataReader;
class DataWriter;
class Stream;
struct BinaryReadOptions;
struct BinaryWriteOptions;
struct JSONReadOptions;
struct JSONWriteOptions;

/// Bits of an attribute's flags word, by position.
enum AttribFlag : u32 {
    attribUntracked = 1u << 0,        ///< no step of a path keeps it; paths resolve it on each use
    attribSilentLink = 1u << 7,       ///< an unresolved link is not reported
    attribPluginMark = 1u << 10,      ///< set by `IPlugin::markCreated`
    attribNoTargets = 1u << 11,       ///< a morph with it is exported without targets
    attribMergeOnAssign = 1u << 28,   ///< an assign that does not replace merges element by element
    attribMergeDuplicates = 1u << 29, ///< with the former: keeps duplicate elements
    attribAnimated = 1u << 30,
    attribTransient = 1u << 31, ///< is never written
};

/// Bits of the mode of `assign`.
enum AssignMode : u32 {
    assignAdopt = 0,
    assignCopy = 1u << 0, ///< replace
    assignMerge = 1u << 1,
};

class BASE1_API Attribute : public NonCopyable {
public:
    virtual ~Attribute();
    /// Type name: `TypeTraits<T>::n_name` or `n_array_name`, or "map", "array", "link".
    virtual name_id type() const = 0;
    virtual AttribLink* asLink();
    virtual AttribArray* asArray();
    virtual AttribMap* asMap();
    const AttribLink* asLink() const { return const_cast<Attribute*>(this)->asLink(); }
    const AttribArray* asArray() const { return const_cast<Attribute*>(this)->asArray(); }
    const AttribMap* asMap() const { return const_cast<Attribute*>(this)->asMap(); }
    /// Deep copy with the same flags word; the caller owns it (but see `IPlugin::clone`). Throws
    /// `exception` if maps and arrays lie in each other deeper than 256 levels.
    virtual Attribute* clone() const = 0;
    /// The scalar element of the value: 0 bool, 1 u8, 2 i8, 3 u16, 4 i16, 5 u32 and plugin
    /// references, 6 i32, 8 TimeCode, 10 float, 11 double, -1 for everything else. Composite
    /// values answer for their component.
    virtual i8 elementCode() const = 0;

    // The stored forms, see `b_attribute_json.h` and `b_attribute_binary.h`.

    /// Writes the value, in the form that tells its type where the value alone does not.
    virtual void writeJson(DataWriter& out, JSONWriteOptions& options) const = 0;
    /// Writes the low eight bits of the flags; overriders put the value behind them.
    virtual void write(Stream& stream, BinaryWriteOptions& options) const;
    /// Reads the value that `in` stands at, without the form that tells its type, and leaves `in`
    /// behind it. False, and a neutral value, if it is none of this type.
    virtual bool readJson(DataReader& in, JSONReadOptions& options) = 0;
    /// Reads the low eight bits of the flags, the others stay; overriders read the value behind
    /// them. False if the data ended before that: what was whole is kept.
    virtual bool read(Stream& stream, BinaryReadOptions& options);

    /// Address of the whole value (-1) or of one element of it: a component of a scalar (index 0
    /// of a value without components is the value), an element of a vector, the value of the
    /// attribute in an array or map. Null for an index without element. Asking for an element of
    /// a vector that is a view makes its elements its own, since they may be written.
    virtual void* data(i32 index = -1) = 0;
    const void* data(i32 index = -1) const { return const_cast<Attribute*>(this)->data(index); }
    /// Elements held: 1 for a scalar, else the length of the vector, array or map.
    virtual u32 size() const;
    /// Removes one element; false when `index` is past the end.
    virtual bool removeItem(u32 index);
    /// Bytes of the value in the binary form.
    virtual u32 byteSize() const = 0;
    /// Takes over the value of `other` by the rules of `mode` (`AssignMode`); false if it can't.
    virtual bool assign(const Attribute& other, u32 mode, i32 index = -1) = 0;
    /// Text form: components with a blank between, vectors of up to four elements joined by
    /// ", ", longer ones as type and count.
    virtual string toString() const;
    /// Reads the text form back, of the whole value or of one element (see `data`). False, and
    /// the value unchanged, if the text is none or the class has no text form.
    virtual bool fromString(string_view text, i32 index = -1);
    virtual bool isAnimated() const;
    /// Stores a value of the attribute's own type, as `data(-1)` of another one gives it, or one
    /// element of it. An index without element is ignored. Maps and arrays store deep copies.
    virtual void setData(const void* value, i32 index = -1) = 0;
    /// -1, 0 or 1: 0 when equal, -1 when the argument is greater (also when there is no element
    /// at `index`), else 1. A NaN on either side gives 1.
    virtual i32 compare(const void* value, i32 index = -1) const = 0;
    /// XXH32 with seed 0 of a vector's bytes as they are stored in files; 0 for everything else.
    virtual u32 hash() const;

    u32 flags() const noexcept { return flags_; }
    void setFlags(u32 flags) noexcept { flags_ = flags; }
    bool hasFlag(AttribFlag flag) const noexcept { return (flags_ & flag) != 0; }
    /// True if a weak link points at this attribute.
    bool hasWeakLinks() const noexcept { return weakHead_ != nullptr; }

protected:
    explicit Attribute(u32 flags = 0) : flags_(flags) {}
    /// Sets every weak link that points here to null.
    void clearWeakLinks() noexcept;
    ReadWriteSpinLock& weakLock() const noexcept { return weakLock_; }

private:
    friend class AttribWeakLink;
    AttribWeakLink* weakHead_ = nullptr;
    u32 flags_;
    mutable ReadWriteSpinLock weakLock_;
};

/// One value of type T, held in place.
template <class T>
class BASE1_API TypedAttribute : public Attribute {
public:
    TypedAttribute() = default;
    explicit TypedAttribute(T value) : value_(std::move(value)) {}
    ~TypedAttribute() override;

    name_id type() const override { return TypeTraits<T>::n_name; }
    Attribute* clone() const override;
    i8 elementCode() const override;
    void writeJson(DataWriter& out, JSONWriteOptions& options) const override;
    void write(Stream& stream, BinaryWriteOptions& options) const override;
    bool readJson(DataReader& in, JSONReadOptions& options) override;
    bool read(Stream& stream, BinaryReadOptions& options) override;
    void* data(i32 index = -1) override;
    using Attribute::data;
    u32 byteSize() const override;
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    string toString() const override;
    bool fromString(string_view text, i32 index = -1) override;
    void setData(const void* value, i32 index = -1) override;
    i32 compare(const void* value, i32 index = -1) const override;

    const T& value() const noexcept { return value_; }
    T& value() noexcept { return value_; }

protected:
    T value_{};
};

/// A vector of values of type T; it may be a view of foreign memory (see `vector`).
template <class T>
class BASE1_API TypedVectorAttribute : public Attribute {
public:
    TypedVectorAttribute() = default;
    explicit TypedVectorAttribute(vector<T> value) : value_(std::move(value)) {}
    ~TypedVectorAttribute() override;

    name_id type() const override { return TypeTraits<T>::n_array_name; }
    Attribute* clone() const override;
    i8 elementCode() const override;
    void writeJson(DataWriter& out, JSONWriteOptions& options) const override;
    void write(Stream& stream, BinaryWriteOptions& options) const override;
    bool readJson(DataReader& in, JSONReadOptions& options) override;
    bool read(Stream& stream, BinaryReadOptions& options) override;
    void* data(i32 index = -1) override;
    using Attribute::data;
    u32 size() const override { return static_cast<u32>(value_.size()); }
    bool removeItem(u32 index) override;
    u32 byteSize() const override;
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    string toString() const override;
    bool fromString(string_view text, i32 index = -1) override;
    void setData(const void* value, i32 index = -1) override;
    i32 compare(const void* value, i32 index = -1) const override;
    u32 hash() const override;

    const vector<T>& value() const noexcept { return value_; }
    vector<T>& value() noexcept { return value_; }

protected:
    vector<T> value_;
};

// All of them are compiled in `base1` alone. The visibility is repeated because the one of the
// template does not reach instantiations over types that are not exported themselves.
#define BASE_EXTERN_SCALAR_ROW(T, text) extern template class BASE1_API TypedAttribute<T>;
#define BASE_EXTERN_ARRAY_ROW(T, text) extern template class BASE1_API TypedVectorAttribute<T>;
BASE_FULL_TYPES(BASE_EXTERN_SCALAR_ROW)
BASE_FULL_TYPES(BASE_EXTERN_ARRAY_ROW)
BASE_SCALAR_TYPES(BASE_EXTERN_SCALAR_ROW)
BASE_ARRAY_TYPES(BASE_EXTERN_ARRAY_ROW)

/// Reference to a plugin object and the path that found it.
class BASE1_API PluginAttribute final : public TypedAttribute<ref<IPlugin>> {
public:
    using TypedAttribute::TypedAttribute;
    ~PluginAttribute() override;
    Attribute* clone() const override;
    /// Takes over the path as well.
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    /// Clears the path.
    void setData(const void* value, i32 index = -1) override;

    AttribPath path; ///< empty unless the reference was found by a path
};

/// Vector of plugin references; merges on assign.
class BASE1_API PluginVectorAttribute final : public TypedVectorAttribute<ref<IPlugin>> {
public:
    PluginVectorAttribute();
    ~PluginVectorAttribute() override;
    Attribute* clone() const override;
};

/// Ordered list of owned attributes, null entries allowed.
class BASE1_API AttribArray final : public Attribute {
public:
    AttribArray() = default;
    ~AttribArray() override;

    name_id type() const override { return n_array; }
    AttribArray* asArray() override { return this; }
    using Attribute::asArray;
    Attribute* clone() const override;
    i8 elementCode() const override { return -1; }
    void writeJson(DataWriter& out, JSONWriteOptions& options) const override;
    void write(Stream& stream, BinaryWriteOptions& options) const override;
    bool readJson(DataReader& in, JSONReadOptions& options) override;
    bool read(Stream& stream, BinaryReadOptions& options) override;
    void* data(i32 index = -1) override;
    using Attribute::data;
    u32 size() const override { return static_cast<u32>(items_.size()); }
    bool removeItem(u32 index) override;
    u32 byteSize() const override;
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    bool isAnimated() const override;
    void setData(const void* value, i32 index = -1) override;
    i32 compare(const void* value, i32 index = -1) const override;

    /// Type name of the elements: the map type for an array of maps; absent if never set.
    name_id typeName() const noexcept { return typeName_; }
    void setTypeName(name_id name) noexcept { typeName_ = name; }

    /// The element at `index`, null for a gap or past the end.
    Attribute* item(u32 index) const noexcept {
        return index < items_.size() ? items_[index] : nullptr;
    }
    /// Appends `item`, which the array then owns; null makes a gap.
    void append(Attribute* item) { items_.push_back(item); }
    /// Replaces (and deletes) the element at `index`, growing the array with gaps as needed.
    void setItem(u32 index, Attribute* item);
    const vector<Attribute*>& items() const noexcept { return items_; }
    /// Deletes this array's elements and takes over those of `other`.
    void takeItems(AttribArray& other);

private:
    vector<Attribute*> items_;
    name_id typeName_;
};

/// Alias of another attribute, reached by a path. Its own value is the path: accessors of a map
/// follow it to the target.
class BASE1_API AttribLink final : public Attribute {
public:
    AttribLink() = default;
    explicit AttribLink(AttribPath path) : path_(std::move(path)) {}
    ~AttribLink() override;

    name_id type() const override { return n_link; }
    AttribLink* asLink() override { return this; }
    using Attribute::asLink;
    Attribute* clone() const override;
    i8 elementCode() const override { return -1; }
    void writeJson(DataWriter& out, JSONWriteOptions& options) const override;
    void write(Stream& stream, BinaryWriteOptions& options) const override;
    bool readJson(DataReader& in, JSONReadOptions& options) override;
    bool read(Stream& stream, BinaryReadOptions& options) override;
    void* data(i32 index = -1) override;
    using Attribute::data;
    u32 byteSize() const override { return 12; }
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    /// Text of the path.
    string toString() const override;
    bool isAnimated() const override;
    void setData(const void* value, i32 index = -1) override;
    i32 compare(const void* value, i32 index = -1) const override;

    const AttribPath& path() const noexcept { return path_; }
    AttribPath& path() noexcept { return path_; }

private:
    AttribPath path_;
};

/// Makes attributes by type name. The process-wide one knows every type of `b_type_traits`, "map",
/// "array" and "link".
class BASE1_API AttribFactory : public NonCopyable {
public:
    using Creator = Attribute* (*)();

    /// Null if the type is unknown or its creator gave nothing; an unknown type is logged.
    /// The caller owns the result.
    Attribute* create(name_id type) const;
    bool has(name_id type) const;
    /// False if the type is known already, which then stays as it is.
    bool add(name_id type, Creator creator);
    bool remove(name_id type);

private:
    map<name_id, Creator> creators_;
};

BASE1_API AttribFactory& attribFactory();

} // namespace base
