#pragma once

#include "b_attribute.h"

/// The sorted map of named attributes that every scene object, option set and document is.
namespace base {

/// Owns attributes under their names, sorted by the names' handles: iteration follows no textual
/// order. A map may have a parent that supplies what it lacks itself, for the finding functions.
///
/// Every access function checks its name first and throws `exception` "The attribute name can't
/// be an empty string." for an absent or empty one. Finding functions answer null for what is
/// absent; of a wrong type or a link that leads nowhere they log one warning and answer null.
/// A missing attribute means the schema's default and is never an error there. A link with the
/// flag `attribSilentLink` breaks in silence.
class BASE1_API AttribMap : public Attribute {
public:
    using Entry = std::pair<name_id, Attribute*>;

    explicit AttribMap(AttribFactory& factory = attribFactory(), name_id typeName = {});
    ~AttribMap() override;

    name_id type() const override { return n_map; }
    AttribMap* asMap() override { return this; }
    using Attribute::asMap;
    Attribute* clone() const override;
    i8 elementCode() const override { return -1; }
    void writeJson(DataWriter& out, JSONWriteOptions& options) const override;
    void write(Stream& stream, BinaryWriteOptions& options) const override;
    bool readJson(DataReader& in, JSONReadOptions& options) override;
    bool read(Stream& stream, BinaryReadOptions& options) override;
    void* data(i32 index = -1) override;
    using Attribute::data;
    u32 size() const override { return static_cast<u32>(entries_.size()); }
    bool removeItem(u32 index) override;
    u32 byteSize() const override;
    bool assign(const Attribute& other, u32 mode, i32 index = -1) override;
    bool isAnimated() const override;
    void setData(const void* value, i32 index = -1) override;
    i32 compare(const void* value, i32 index = -1) const override;

    /// The map's schema type.
    virtual name_id typeName() const { return typeName_; }
    // Asked by the path machinery; answered by plugin objects that drive attributes.
    virtual bool reservedQuery() const;
    virtual bool isPathKeyed(const AttribPath& path) const;
    /// Asked by `isAnimated` of a link whose path starts at this object.
    virtual bool isPathAnimated(const AttribPath& path) const;
    virtual bool isPathDriven(const AttribPath& path) const;
    /// Mode 0: a link is about to read what `path`, which starts at this object, names, and it is
    /// missing or untracked; the object may bring it up to date. Not called again for this object
    /// while it works on that. Other modes: what `path` names is about to change, see
    /// `findAttributeMutable`.
    virtual void pathChanged(const AttribPath& path, u32 mode);
    virtual void pathResolved(const AttribPath& path, u32 a, u32 b, u32 c);
    virtual bool pathIsLinked(const AttribPath& path, u32 x) const;
    virtual void pathTouched(const AttribPath& path, u32 x);

    void setTypeName(name_id name) noexcept { typeName_ = name; }
    const vector<Entry>& entries() const noexcept { return entries_; }
    AttribFactory& factory() const noexcept { return *factory_; }

    /// The map that supplies missing attributes; not owned, forgotten when it dies.
    AttribMap* parent() const noexcept;
    void setParent(AttribMap* parent);

    /// The attribute under `name`. Links are followed to their end, at most 64 of them; a miss
    /// goes on in the parent unless `inherit` is false.
    Attribute* findAttribute(name_id name, bool followLinks = true, bool inherit = true) const;
    AttribMap* findMap(name_id name, bool followLinks = true, bool inherit = true) const;
    AttribArray* findArray(name_id name, bool followLinks = true, bool inherit = true) const;
    /// As `findAttribute`, for changing what it finds: tells the objects concerned by `pathChanged`
    /// with a mode of that bit alone. Bit 0 of `mode` tells the object at the root of each link on
    /// the way, bit 1 this map, if it is a plugin object.
    Attribute* findAttributeMutable(name_id name, u32 mode = 3, bool followLinks = true,
                                    bool inherit = true);

    template <class T>
    const T* findAttribute(name_id name) const;
    template <class T>
    const vector<T>* findVecAttribute(name_id name) const;

    /// The value under `name` in this map itself, made with its type's zero if absent. Follows
    /// links. Throws on a type mismatch, for which a link that leads nowhere counts, and on a type
    /// that the factory does not know.
    template <class T>
    T& attribute(name_id name);
    /// The same for a vector.
    template <class T>
    vector<T>& vecAttribute(name_id name);
    /// The same for an array, and for a map with the schema type `typeName`.
    AttribArray& arrayAttribute(name_id name);
    AttribMap& mapAttribute(name_id name, name_id typeName);

    /// Puts `a` under `name`; the map owns it from then on (on a throw the caller keeps it).
    /// If an attribute of the same type is there, it takes over the value and keeps its flags,
    /// and `a` is deleted; one of another type is replaced.
    void attribute(name_id name, Attribute* a);
    /// The array of maps under `name` in this map itself, made in place of anything else, grown to
    /// at least `count` maps that share this map's factory. Returns the first element, null if
    /// `count` is 0 or that element is no map.
    AttribMap* attribute(u32 count, name_id name);

    /// Binds `value` to the attribute: takes its value over if it exists, else makes it with
    /// `value`. Does nothing if it is a link. Throws as `attribute<T>`.
    template <class T>
    void syncAttribute(name_id name, T& value);

    /// Deletes the attribute; false if absent.
    bool removeAttribute(name_id name);
    void clear();

protected:
    /// Deletes this map's attributes and takes over those of `other`.
    void takeEntries(AttribMap& other);

private:
    friend class AttribPath;
    const Entry* lowerBound(name_id name) const noexcept {
        return std::lower_bound(
            entries_.begin(), entries_.end(), name,
            [](const Entry& entry, name_id wanted) { return entry.first < wanted; });
    }
    /// The attribute under `name` in this map itself, links not followed.
    Attribute* findOwn(name_id name) const noexcept {
        const Entry* at = lowerBound(name);
        return at != entries_.end() && at->first == name ? at->second : nullptr;
    }
    /// The same in the first parent that has it.
    Attribute* findInherited(name_id name) const noexcept;
    Attribute* followReported(Attribute* a, name_id name) const;
    const Attribute* findTyped(name_id name, name_id type, bool vectorForm) const;
    /// Puts `a` under `name`, of which the map has none yet.
    Attribute& insert(name_id name, std::unique_ptr<Attribute> a);
    /// Puts `a` under `name`, deleting what was there.
    void replace(name_id name, std::unique_ptr<Attribute> a);
    Attribute& make(name_id name, name_id type, const char* function);
    Attribute& requireTyped(name_id name, name_id type, const char* function);
    Attribute* syncTyped(name_id name, name_id type, bool& made);
    void merge(AttribMap& donor, u32 mode);

    vector<Entry> entries_;
    name_id typeName_;
    AttribFactory* factory_;
    AttribWeakLink parent_;
};

template <class T>
const T* AttribMap::findAttribute(name_id name) const {
    const Attribute* a = findTyped(name, TypeTraits<T>::n_name, false);
    return a ? static_cast<const T*>(a->data(-1)) : nullptr;
}

template <class T>
const vector<T>* AttribMap::findVecAttribute(name_id name) const {
    const Attribute* a = findTyped(name, TypeTraits<T>::n_array_name, true);
    return a ? static_cast<const vector<T>*>(a->data(-1)) : nullptr;
}

template <class T>
T& AttribMap::attribute(name_id name) {
    return *static_cast<T*>(
        requireTyped(name, TypeTraits<T>::n_name, "base::AttribMap::attribute").data(-1));
}

template <class T>
vector<T>& AttribMap::vecAttribute(name_id name) {
    return *static_cast<vector<T>*>(
        requireTyped(name, TypeTraits<T>::n_array_name, "base::AttribMap::vecAttribute").data(-1));
}

template <class T>
void AttribMap::syncAttribute(name_id name, T& value) {
    bool made = false;
    Attribute* a = syncTyped(name, TypeTraits<T>::n_name, made);
    if (!a)
        return;
    if (made)
        a->setData(&value, -1);
    else
        value = *static_cast<const T*>(a->data(-1));
}

} // namespace base
