#include "b_attribute_json_forms.h"
#include "b_log.h"

namespace base {

namespace {

constexpr i32 documentVersion = 1;
constexpr string_view documentOwner = "document"; // in messages
constexpr string_view versionMember = "@version";
constexpr string_view attributesMember = "@attributes";
constexpr string_view objectsMember = "@objects";

/// By the ids of the objects: the names that none of the others has.
vector<const string*> uniqueNames(const PluginFactory& factory, const JSONWriteOptions& options) {
    vector<const string*> names(factory.pluginCount());
    hash_map<string_view, u32> firstIds;
    firstIds.reserve(factory.pluginCount());
    for (const ref<IPlugin>& object : factory.plugins()) {
        const string* name = object && isWritten(*object, options) ? plainNameOf(*object) : nullptr;
        if (!name)
            continue;
        const auto [first, isNew] = firstIds.try_emplace(*name, object->id());
        names[first->second] = isNew ? name : nullptr;
    }
    return names;
}

bool isEmptyDocument(const AttribMap& attributes) {
    return (attributes.flags() & storedFlags) == 0 && attributes.typeName().isEmpty() &&
           std::all_of(attributes.entries().begin(), attributes.entries().end(),
                       [](const AttribMap::Entry& entry) { return !isStored(*entry.second); });
}

void writeObject(const IPlugin& object, DataWriter& out, JSONWriteOptions& options) {
    const NestedValue nested(options.depth);
    const string* name = plainNameOf(object);
    options.owner = name ? *name : object.typeName().view();
    out.beginObject();
    out.name("@type");
    string repaired;
    out.text(validText(object.typeName(), options, repaired));
    writeFlags(out, object.flags());
    writeMembers(object, out, options);
    out.endObject();
}

/// The members of a document, and its objects once they are made.
class DocumentReader final : public StoredDocument {
public:
    DocumentReader(PluginFactory& factory, DataReader& in) : factory_(factory), in_(in) {
        options_.attribFactory = &factory.attributeFactory();
        options_.firstId = factory.pluginCount();
        options_.owner = documentOwner;
    }

    u32 objectCount() const override { return static_cast<u32>(options_.objects.size()); }

    /// The parts of the document. False, with a message, if it is none.
    bool readHead() {
        if (in_.kind() != DataKind::object) {
            logAtLine("Missing object opening bracket!");
            return false;
        }
        static constexpr string_view known[] = {versionMember, attributesMember, objectsMember};
        JsonMembers members;
        collectMembers(in_, members);
        checkOwnMembers(members, known, in_, options_);
        warnOfForeign(members, in_, options_);
        attributes_ = placeOf(members, attributesMember);
        return checkVersion(placeOf(members, versionMember)) &&
               findObjects(placeOf(members, objectsMember));
    }

    void createObjects() override {
        for (u32 place = 0; place < objectCount(); ++place) {
            in_.setPlace(std::as_const(places_)[place]);
            if (in_.kind() == DataKind::null)
                continue;
            if (in_.kind() != DataKind::object) {
                logAtLine("Missing object opening bracket!");
                logAtLine("Error reading plugin!");
                continue;
            }
            createObject(place);
        }
    }

    void readObjects() override {
        ListProgress progress(readingPlugins, objectCount());
        for (u32 place = 0; place < objectCount(); ++place) {
            progress.at(place);
            if (const ref<IPlugin> object = std::as_const(options_.objects)[place]) {
                in_.setPlace(std::as_const(places_)[place]);
                readObject(*object);
            }
        }
    }

    std::unique_ptr<AttribMap> readAttributes() override {
        if (attributes_ == noPlace)
            return nullptr;
        in_.setPlace(attributes_);
        options_.owner = documentOwner;
        options_.attribute = nameServer().id(attributesMember);
        std::unique_ptr<Attribute> read;
        if (in_.kind() == DataKind::object)
            read.reset(readJsonAttribute(in_, options_));
        if (read && read->asMap())
            return std::unique_ptr<AttribMap>(read.release()->asMap());
        in_.setPlace(attributes_);
        logUnreadable(in_, options_, n_map.view());
        return nullptr;
    }

private:
    static constexpr u32 noPlace = 0xffffffff;

    static u32 placeOf(const JsonMembers& members, string_view name) {
        const DataMember* found = findMember(members, name);
        return found ? found->place : noPlace;
    }

    void logAtLine(string_view text) const {
        log().log(logSystem, logError, "json parser {}({})| {}", in_.source(), in_.line(), text);
    }

    bool checkVersion(u32 place) {
        i64 version = 0;
        if (place == noPlace) {
            logAtLine("Missing document version!");
            return false;
        }
        in_.setPlace(place);
        if (!in_.number(version))
            version = 0;
        in_.setPlace(place);
        if (version == documentVersion)
            return true;
        log().log(logSystem, logError,
                  "json parser {}({})| Unsupported document version! Current version {}, needed "
                  "{}.",
                  in_.source(), in_.line(), documentVersion, version);
        return false;
    }

    bool findObjects(u32 place) {
        if (place == noPlace)
            return true;
        in_.setPlace(place);
        if (in_.kind() != DataKind::array) {
            logExpectedArray(in_);
            return false;
        }
        const u32 count = in_.length();
        if (u64{options_.firstId} + count >= JSONReadOptions::severalObjects) {
            logAtLine("Too many plugins!");
            return false;
        }
        places_.reserve(count);
        for (in_.enter(); in_.kind() != DataKind::end; in_.skip())
            places_.push_back(in_.place());
        options_.objects.resize(count);
        options_.placeOfName.reserve(count);
        return true;
    }

    /// The text of a string, in either form; empty if the member is none.
    string_view stringOf(const DataMember& member) {
        if (member.kind != DataKind::object)
            return member.text;
        const u32 behind = in_.place();
        in_.setPlace(member.place);
        in_.enter();
        string_view type, text;
        for (DataMember inner; in_.nextMember(inner);) {
            if (inner.name == "@type")
                type = inner.text;
            else if (inner.name == "@value")
                text = inner.text;
        }
        in_.setPlace(behind);
        return type == TypeTraits<string>::n_name.view() ? text : string_view();
    }

    void createObject(u32 place) {
        string_view typeText, name;
        bool hasType = false;
        in_.enter();
        for (DataMember member; in_.nextMember(member);) {
            if (member.name == "@type")
                hasType = readNameText(&member, typeText);
            else if (member.name == "name")
                name = stringOf(member);
        }
        if (!hasType) {
            in_.setPlace(std::as_const(places_)[place]);
            logAtLine("Error reading plugin!");
            return;
        }
        const name_id type = validName(typeText);
        options_.objects[place] = createStored(factory_, type, options_.firstId + place);
        if (name.empty())
            return;
        const auto [at, isNew] = options_.placeOfName.emplace(name, place);
        if (!isNew)
            at->second |= JSONReadOptions::severalObjects;
    }

    void readObject(IPlugin& object) {
        static constexpr string_view known[] = {"@type", "@flags"};
        const u32 start = in_.place();
        JsonMembers members;
        collectMembers(in_, members);
        in_.setPlace(start);
        string_view name;
        const bool hasName = readNameText(findMember(members, "name"), name) && !name.empty();
        options_.owner = hasName ? name : object.typeName().view();
        options_.attribute = {};

        const NestedValue nested(options_.depth);
        checkOwnMembers(members, known, in_, options_);
        u32 flags = 0;
        if (readFlags(findMember(members, "@flags"), in_, options_, flags))
            object.setFlags((object.flags() & ~storedFlags) | flags);
        readMembers(object, members, in_, options_);
    }

    PluginFactory& factory_;
    DataReader& in_;
    JSONReadOptions options_;
    u32 attributes_ = noPlace;
    vector<u32> places_; ///< of the objects in the text
};

} // namespace

void PluginFactory::writeJson(Stream& stream) const {
    JSONWriteOptions options;
    options.factory = this;
    options.uniqueNames = uniqueNames(*this, options);
    JSONAttrWriter out(stream);
    out.beginObject();
    out.name(versionMember);
    out.number(documentVersion);
    if (!isEmptyDocument(attributes_)) {
        options.owner = documentOwner;
        out.name(attributesMember);
        attributes_.writeJson(out, options);
    }

    ListProgress progress(writingPlugins, plugins_.size());
    out.name(objectsMember);
    out.beginArray();
    for (std::size_t i = 0; i < plugins_.size(); ++i) {
        progress.at(i);
        const ref<IPlugin>& object = plugins_[i];
        if (object && isWritten(*object, options))
            writeObject(*object, out, options);
        else
            out.null();
    }
    out.endArray();
    out.endObject();
    out.finish();
}

bool PluginFactory::readJson(Stream& stream) {
    JSONAttrReader in;
    if (!in.open(stream))
        return false;
    DocumentReader document(*this, in);
    if (!document.readHead())
        return false;

    readDocument(document, documentVersion);
    return true;
}

} // namespace base
