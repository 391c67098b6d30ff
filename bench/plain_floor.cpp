#include "plain_floor.h"

#include "b_base64.h"
#include "b_pages.h"

#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <stdexcept>
#include <unistd.h>

namespace bench {

using base::u32;
using base::u8;

namespace {

using Block = std::unique_ptr<u8[]>;

Block allocate(std::size_t byteCount) {
    Block block(new u8[byteCount]);
    base::prefault(block.get(), byteCount);
    return block;
}

template <class T>
u8* append(u8* to, std::span<const T> array) {
    std::memcpy(to, array.data(), array.size_bytes());
    return to + array.size_bytes();
}

void appendMeshes(u8* to, const base::vector<MeshArrays>& meshes) {
    for (const MeshArrays& mesh : meshes) {
        to = append(to, mesh.positions);
        to = append(to, mesh.normals);
        to = append(to, mesh.uvs);
        to = append(to, mesh.indices);
    }
}

void writeAtOnce(const std::string& path, const u8* data, std::size_t byteCount) {
    const int file = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0666);
    const bool isWhole = write(file, data, byteCount) == static_cast<ssize_t>(byteCount);
    if (close(file) != 0 || !isWhole)
        throw std::runtime_error(path + " was not written");
}

std::string readPart(std::ifstream& file, std::size_t start, std::size_t length) {
    std::string part(length, '\0');
    file.seekg(static_cast<std::streamoff>(start));
    if (!file.read(part.data(), static_cast<std::streamsize>(length)))
        throw std::runtime_error("an exported file is too short");
    return part;
}

std::size_t fileLength(std::ifstream& file) {
    file.seekg(0, std::ios::end);
    return static_cast<std::size_t>(file.tellg());
}

u32 readNumber(std::ifstream& file, std::size_t start) {
    u32 number = 0;
    std::memcpy(&number, readPart(file, start, sizeof number).data(), sizeof number);
    return number;
}

} // namespace

FileFrame readContainerFrame(const std::string& path, std::size_t byteCount) {
    constexpr std::size_t chunkHeader = 8, jsonHeader = 12;
    std::ifstream file(path, std::ios::binary);
    const std::size_t binaryHeader = jsonHeader + chunkHeader + readNumber(file, jsonHeader);
    if (readNumber(file, binaryHeader) != (byteCount + 3) / 4 * 4)
        throw std::runtime_error("the export does not hold the same bytes as its floor");
    return {readPart(file, 0, binaryHeader + chunkHeader), {}};
}

FileFrame readTextFrame(const std::string& path, std::size_t byteCount) {
    constexpr std::size_t mostBefore = 1 << 16;
    std::ifstream file(path, std::ios::binary);
    const std::size_t length = fileLength(file);
    const std::string start = readPart(file, 0, std::min(length, mostBefore));
    const std::size_t mark = start.find(";base64,");
    const std::size_t dataStart = mark + std::strlen(";base64,");
    const std::size_t dataEnd = dataStart + base::base64Length(byteCount);
    if (mark == start.npos || dataEnd >= length || readPart(file, dataEnd, 1) != "\"")
        throw std::runtime_error("the export does not hold the same bytes as its floor");
    return {start.substr(0, dataStart), readPart(file, dataEnd, length - dataEnd)};
}

void writePlain(const base::vector<MeshArrays>& meshes, const FileFrame& frame,
                const std::string& path) {
    const std::size_t byteCount = byteCountOf(meshes);
    Block packed = allocate(byteCount);
    appendMeshes(packed.get(), meshes);

    const std::size_t fileLength = frame.before.size() + byteCount;
    const Block content = allocate(fileLength);
    u8* const data = append<char>(content.get(), frame.before);
    std::memcpy(data, packed.get(), byteCount);
    packed.reset();
    writeAtOnce(path, content.get(), fileLength);
}

void writeEmbedded(const base::vector<MeshArrays>& meshes, const FileFrame& frame,
                   const std::string& path) {
    const std::size_t byteCount = byteCountOf(meshes);
    Block packed = allocate(byteCount);
    appendMeshes(packed.get(), meshes);
    Block data = allocate(byteCount);
    std::memcpy(data.get(), packed.get(), byteCount);
    packed.reset();

    const std::size_t encodedLength = base::base64Length(byteCount);
    const std::size_t fileLength = frame.before.size() + encodedLength + frame.after.size();
    const Block content = allocate(fileLength);
    u8* const encoded = append<char>(content.get(), frame.before);
    base::base64Encode(data.get(), byteCount, reinterpret_cast<char*>(encoded));
    append<char>(encoded + encodedLength, frame.after);
    writeAtOnce(path, content.get(), fileLength);
}

} // namespace bench
