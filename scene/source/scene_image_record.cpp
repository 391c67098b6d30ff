#include "scene_image_record.h"

#include "b_name.h"

namespace scene {

using base::AttribMap;
using base::name_id;

namespace {

struct Names {
    name_id list = base::nameServer().id("exportedImages");
    name_id name = base::nameServer().id("name");
    name_id sources = base::nameServer().id("sources");
    name_id work = base::nameServer().id("work");
    name_id width = base::nameServer().id("width");
    name_id height = base::nameServer().id("height");
    name_id byteLength = base::nameServer().id("byteLength");
    name_id pictureSource = base::nameServer().id("pictureSource");
    name_id ignoresOpaqueAlpha = base::nameServer().id("ignoresOpaqueAlpha");
    name_id pictureFiles = base::nameServer().id("pictureFiles");
};

const Names& names() {
    static const Names interned;
    return interned;
}

void makeTransient(base::Attribute& attribute) {
    attribute.setFlags(attribute.flags() | base::attribTransient);
}

template <class T>
void take(const AttribMap& item, name_id name, T& value) {
    if (const T* found = item.findAttribute<T>(name))
        value = *found;
}

} // namespace

void storeImageRecords(AttribMap& scene, const base::vector<ImageRecord>& records) {
    const Names& n = names();
    scene.removeAttribute(n.list);
    base::AttribArray& list = scene.arrayAttribute(n.list);
    makeTransient(list);
    for (const ImageRecord& record : records) {
        auto* item = new AttribMap;
        list.append(item);
        item->attribute<base::string>(n.name) = record.name;
        item->vecAttribute<base::string>(n.sources) = record.sources;
        item->attribute<base::u8>(n.work) = static_cast<base::u8>(record.work);
        item->attribute<base::i32>(n.width) = record.width;
        item->attribute<base::i32>(n.height) = record.height;
        item->attribute<base::u32>(n.byteLength) = record.byteLength;
    }
}

base::vector<ImageRecord> findImageRecords(const AttribMap& scene) {
    const Names& n = names();
    base::vector<ImageRecord> records;
    const base::AttribArray* list = scene.findArray(n.list);
    for (base::u32 i = 0; list && i < list->size(); ++i) {
        const base::Attribute* entry = list->item(i);
        const AttribMap* item = entry ? entry->asMap() : nullptr;
        if (!item)
            continue;
        ImageRecord& record = records.emplace_back();
        take(*item, n.name, record.name);
        if (const auto* sources = item->findVecAttribute<base::string>(n.sources))
            record.sources = *sources;
        base::u8 work = 0;
        take(*item, n.work, work);
        record.work = static_cast<ImageRecord::Work>(work);
        take(*item, n.width, record.width);
        take(*item, n.height, record.height);
        take(*item, n.byteLength, record.byteLength);
    }
    return records;
}

void setPictureSource(AttribMap& texture, const base::string& path) {
    const name_id name = names().pictureSource;
    texture.attribute<base::string>(name) = path;
    makeTransient(*texture.findAttribute(name));
}

const base::string* findPictureSource(const AttribMap& texture) {
    return texture.findAttribute<base::string>(names().pictureSource);
}

void setIgnoresOpaqueAlpha(AttribMap& texture) {
    texture.attribute<bool>(names().ignoresOpaqueAlpha) = true;
}

bool ignoresOpaqueAlpha(const AttribMap& texture) {
    const bool* value = texture.findAttribute<bool>(names().ignoresOpaqueAlpha);
    return value && *value;
}

void setPictureFiles(AttribMap& scene, const base::vector<base::string>& paths) {
    const name_id name = names().pictureFiles;
    scene.vecAttribute<base::string>(name) = paths;
    makeTransient(*scene.findAttribute(name));
}

const base::vector<base::string>* findPictureFiles(const AttribMap& scene) {
    return scene.findVecAttribute<base::string>(names().pictureFiles);
}

} // namespace scene
