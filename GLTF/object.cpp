#include "GLTF/document.h"

#include "GLTF/json_writer.h"
#include "GLTF/object_pool.h"
#include "GLTF/walk.h"

namespace GLTF {

namespace {

template <class Objects>
void writeObjects(JsonWriter& writer, const Objects& objects, const Options& options) {
    writer.startObject();
    for (const auto& [key, object] : objects) {
        writer.keyText(key);
        writer.startObject();
        object->writeJSON(writer, options);
        writer.endObject();
    }
    writer.endObject();
}

} // namespace

void* Counted::operator new(std::size_t byteCount) {
    return object_pool::allocate(byteCount);
}

void Counted::operator delete(void* block, std::size_t byteCount) noexcept {
    object_pool::free(block, byteCount);
}

u32 Walk::nextNumber() noexcept {
    static u32 number = 0;
    if (++number == 0)
        ++number;
    return number;
}

Object::~Object() = default;

string Object::typeName() const {
    return "object";
}

Object* Object::clone(Object* target) const {
    target->id = id;
    target->name = name;
    for (const auto& [key, extension] : extensions)
        target->extensions[key] = extension;
    for (const auto& [key, extra] : extras)
        target->extras[key] = extra;
    return target;
}

void Object::writeJSON(JsonWriter& writer, const Options& options) {
    if (!name.empty())
        writer.textMember("name", name);
    if (!extensions.empty()) {
        writer.key("extensions");
        writeObjects(writer, extensions, options);
    }
    if (!extras.empty()) {
        writer.key("extras");
        writeObjects(writer, extras, options);
    }
}

string Object::getStringId() const {
    return stringId.empty() ? typeName() + "_" + std::to_string(id) : stringId;
}

Extension::~Extension() = default;

} // namespace GLTF
