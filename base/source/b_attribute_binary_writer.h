#pragma once

#include "b_attribute_binary.h"
#include "b_attribute_map.h"
#include "b_attribute_values.h"
#include "stream/b_stream.h"

#include <mutex>

/// Writing the binary form, inside the library. Sizes stand before what they tell, so everything
/// is measured first, in the order in which it will be written.
namespace base {

constexpr u32 maxBinaryString = 0x10000000;
constexpr u32 maxBinaryTableString = 2048;

/// What stands before the own name of a map's type where a type name is stored.
constexpr string_view mapTypePrefix = "map:";

/// Numbers names in the order of their first use. The numbers lie in the extra fields of the name
/// records, so one table at a time exists in the process; another thread waits for its turn.
class BinaryNameTable : public NonCopyable {
public:
    static constexpr std::size_t maxNames = 65535;

    BinaryNameTable();
    ~BinaryNameTable(); ///< gives the fields back
    void add(name_id name);
    u16 id(name_id name) const;
    const vector<name_id>& names() const noexcept { return names_; }
    void clear() noexcept;

private:
    std::unique_lock<std::mutex> turn_;
    vector<name_id> names_;
};

/// Different names in the order of their first use.
class BinaryTypeTable {
public:
    u32 add(name_id name);
    const vector<name_id>& names() const noexcept { return names_; }

private:
    vector<name_id> names_;
    hash_map<name_id, u32> ids_;
};

struct BinaryWriteState {
    BinaryNameTable* nameTable = nullptr; ///< null: names stand as text wherever they are used
    vector<u32> sizes;                    ///< of all attributes in maps and arrays, as written
    std::size_t nextSize = 0;
    hash_map<name_id, name_id> mapTypes; ///< by the own name of a map's type
    BinaryTypeTable attributeTypes;
    u32 depth = 0;
    const IPlugin* object = nullptr; ///< that is being written, null if none
    name_id attributeName;           ///< the innermost that is being written
};

/// Bytes of a whole attribute with its flags; adds what it needs to the lists of the state.
u64 measureBinary(const Attribute& attribute, BinaryWriteState& state);

/// Measures an attribute with all within it if the call that writes it is the outermost one.
class BinaryWriteScope : public NonCopyable {
public:
    BinaryWriteScope(const Attribute& attribute, BinaryWriteOptions& options);
    ~BinaryWriteScope();

private:
    BinaryWriteOptions& options_;
    std::unique_ptr<BinaryWriteState> own_;
};

class BinaryWriter {
public:
    BinaryWriter(Stream& stream, BinaryWriteOptions& options)
        : stream_(stream), options_(options) {}

    void bytes(const void* source, u64 byteCount) {
        if (byteCount != 0)
            stream_.write(source, byteCount);
    }
    template <class T>
    void number(T value) {
        static_assert(std::is_arithmetic_v<T>);
        bytes(&value, sizeof value);
    }
    void count(std::size_t elements);
    void text(string_view text);
    void name(name_id name);
    /// Name, type and size, and the attribute itself.
    void entry(name_id name, const Attribute& attribute);
    /// Null for a gap.
    void element(const Attribute* attribute);
    /// The id by which a document knows `object`; that of none, with a message, if it is not
    /// stored.
    u32 idOf(const IPlugin* object) const;

private:
    Stream& stream_;
    BinaryWriteOptions& options_;
};

} // namespace base
