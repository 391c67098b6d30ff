#include "scene_mesh_index.h"

#include "b_log.h"
#include "scene_corner_numbering.h"
#include "scene_mesh.h"
#include "scene_mesh_channels.h"
#include "scene_mesh_edit.h"
#include "scene_mesh_joints.h"
#include "scene_mesh_primitive.h"
#include "scene_schema.h"

#include <algorithm>

namespace scene {

using base::AttribMap;
using base::name_id;
using base::u32;
using base::vector;

namespace {

name_id vertexCornersName() {
    static const name_id name = base::nameServer().id("vertexCorners");
    return name;
}

name_id vertexPositionsName() {
    static const name_id name = base::nameServer().id("vertexPositions");
    return name;
}

std::unique_ptr<base::Attribute> makeArray(vector<u32> values, u32 flags = 0) {
    auto array = std::make_unique<base::TypedVectorAttribute<u32>>(std::move(values));
    array->setFlags(flags);
    return array;
}

bool anySetHasIndices(const AttribMap& mesh, const SchemaAttribute<Items>& sets, name_id indices) {
    const u32 count = getListCount(mesh, sets);
    for (u32 i = 0; i < count; ++i) {
        const AttribMap* set = findListItem(mesh, sets, i);
        if (set && findIndices(*set, indices))
            return true;
    }
    return false;
}

/// True if some array has indices of its own. A mesh without them is as it should be.
bool hasOwnIndices(const AttribMap& mesh) {
    return findIndices(mesh, mesh_schema::n_positionIndices) ||
           findIndices(mesh, mesh_schema::n_normalIndices) ||
           findIndices(mesh, mesh_schema::n_tangentIndices) ||
           anySetHasIndices(mesh, mesh_schema::n_uvSets, meshUVSet_schema::n_indices) ||
           anySetHasIndices(mesh, mesh_schema::n_colorSets, meshColorSet_schema::n_indices);
}

class SingleIndexConversion {
public:
    SingleIndexConversion(AttribMap& mesh, bool isMorphBase)
        : mesh_(mesh), name_(objectName(mesh)), isMorphBase_(isMorphBase) {}

    bool run();

private:
    bool findCorners();
    void leaveOut(const Channel& channel, const char* what, u32 expected, std::size_t found);
    void dropMisfittingIndices();
    bool needsWork() const;
    bool arePositionsInRange() const;
    void addressChannels();
    void makeTupleColumns();
    void makeValueColumns();
    bool isUnchanged(const Channel& channel) const;
    void gatherChannels();
    void gatherJointsSets();
    void keepOrigins();
    void eraseIndexArrays();
    void removeTriangleRanges();

    vector<u32> positionsOfVertices() const;

    AttribMap& mesh_;
    base::string name_;
    bool isMorphBase_;
    vector<Channel> channels_; ///< the first is the positions
    const u32* positionOfCorner_ = nullptr;
    u32 cornerCount_ = 0;
    vector<const u32*> columns_; ///< what tells vertices apart
    vector<vector<u32>> columnStorage_;
    CornerNumbering numbering_;
    MeshEdit edit_;
};

bool SingleIndexConversion::run() {
    channels_ = collectChannels(mesh_);
    if (!findCorners())
        return true;
    dropMisfittingIndices();
    if (!needsWork()) {
        edit_.commit();
        return true;
    }
    if (!arePositionsInRange()) {
        base::log().log(base::logScene, base::logError,
                        "{}| Unable to convert to single indexed vertex data...", name_);
        return false;
    }
    addressChannels();
    const bool allIndexed =
        std::ranges::all_of(channels_, [](const Channel& c) { return !c.isKey || c.ownIndices; });
    if (allIndexed)
        makeTupleColumns();
    else
        makeValueColumns();
    numbering_ = numberCorners(columns_, cornerCount_, channels_[0].count, name_);
    gatherChannels();
    gatherJointsSets();
    keepOrigins();
    eraseIndexArrays();
    edit_.replace(mesh_, mesh_schema::n_indices, makeArray(std::move(numbering_.vertexOfCorner)));
    edit_.commit();
    removeTriangleRanges();
    return true;
}

/// The corners are those of the index array of the positions. False if there is none, or if there
/// are no positions.
bool SingleIndexConversion::findCorners() {
    if (channels_.empty() || !(channels_[0].name == mesh_schema::n_positions))
        return false;
    const vector<u32>* indices = channels_[0].ownIndices;
    if (!indices)
        indices = findIndices(mesh_, mesh_schema::n_indices);
    if (!indices)
        return false;
    positionOfCorner_ = indices->data();
    cornerCount_ = static_cast<u32>(indices->size());
    return true;
}

void SingleIndexConversion::leaveOut(const Channel& channel, const char* what, u32 expected,
                                     std::size_t found) {
    base::log().log(base::logScene, base::logError,
                    "gltf |{}| Wrong number of {} '{}', the data is left out! Expected {} "
                    "elements, found {}.",
                    name_, what, channel.name, expected, found);
    edit_.erase(*channel.owner, channel.name);
}

/// Leaves out channels whose own index array has not one entry per corner.
void SingleIndexConversion::dropMisfittingIndices() {
    vector<Channel> kept;
    for (const Channel& channel : channels_) {
        const vector<u32>* own = channel.ownIndices;
        if (own && own->size() != cornerCount_)
            leaveOut(channel, "indices of", cornerCount_, own->size());
        else
            kept.push_back(channel);
    }
    channels_ = std::move(kept);
}

bool SingleIndexConversion::needsWork() const {
    return std::ranges::any_of(channels_, [](const Channel& c) { return c.ownIndices; });
}

bool SingleIndexConversion::arePositionsInRange() const {
    Channel positions = channels_[0];
    positions.indexOfCorner = positionOfCorner_;
    return positions.coversAll(cornerCount_);
}

/// Settles how the corners address each channel. One without indices of its own follows the
/// positions or, if it has one element per corner, the corners; else it is left out.
void SingleIndexConversion::addressChannels() {
    const u32 positionCount = channels_[0].count;
    vector<Channel> kept;
    for (Channel& channel : channels_) {
        if (channel.ownIndices) {
            channel.indexOfCorner = channel.ownIndices->data();
        } else if (channel.count == positionCount) {
            channel.indexOfCorner = positionOfCorner_;
        } else if (channel.count != cornerCount_) {
            leaveOut(channel, "elements in", positionCount, channel.count);
            continue;
        }
        kept.push_back(channel);
    }
    channels_ = std::move(kept);
}

/// Vertices are told apart by their indices: each distinct array is one column.
void SingleIndexConversion::makeTupleColumns() {
    for (const Channel& channel : channels_)
        if (channel.isKey && std::ranges::find(columns_, channel.indexOfCorner) == columns_.end())
            columns_.push_back(channel.indexOfCorner);
}

/// Entries that are equal exactly if the corners address equal bytes. Empty if the indices
/// themselves are such.
vector<u32> makeValueColumn(const Channel& channel, u32 cornerCount) {
    const vector<u32> numbers = numberEqual(channel.data, channel.wordCount, channel.count);
    vector<u32> column;
    if (numbers.empty() && channel.indexOfCorner && channel.coversAll(cornerCount))
        return column;
    column.resizeUninitialized(cornerCount);
    u32* out = column.data();
    for (u32 c = 0; c < cornerCount; ++c) {
        const u32 index = channel.covers(channel.index(c)) ? channel.index(c) : channel.count;
        out[c] = numbers.empty() ? index : numbers[index];
    }
    return column;
}

/// Vertices are told apart by the bytes of their data. Joints and morph targets go by position,
/// so there the position index takes part, which settles the position's bytes as well.
void SingleIndexConversion::makeValueColumns() {
    const bool byPosition = isMorphBase_ || getListCount(mesh_, mesh_schema::n_jointsSets) != 0;
    for (const Channel& channel : channels_) {
        if (!channel.isKey)
            continue;
        if (byPosition && columns_.empty()) {
            columns_.push_back(positionOfCorner_);
            continue;
        }
        const vector<u32>& column =
            columnStorage_.emplace_back(makeValueColumn(channel, cornerCount_));
        columns_.push_back(column.empty() ? channel.indexOfCorner : column.data());
    }
}

/// True if the vertices are the elements of the channel in their order.
bool SingleIndexConversion::isUnchanged(const Channel& channel) const {
    const vector<u32>& corners = numbering_.firstCorner;
    if (corners.size() != channel.count)
        return false;
    u32 v = 0;
    while (v < channel.count && channel.index(corners[v]) == v && v != channel.invalidIndex)
        ++v;
    return v == channel.count;
}

void SingleIndexConversion::gatherChannels() {
    for (const Channel& channel : channels_) {
        if (isUnchanged(channel))
            continue;
        bool outOfRange = false;
        auto fresh = channel.gather(channel, numbering_.firstCorner, outOfRange);
        if (outOfRange)
            base::log().log(base::logScene, base::logError,
                            "gltf |{}| Found an index out of range for '{}', zero is taken!", name_,
                            channel.name);
        edit_.replace(*channel.owner, channel.name, std::move(fresh));
    }
}

vector<u32> SingleIndexConversion::positionsOfVertices() const {
    vector<u32> positions;
    positions.reserve(numbering_.firstCorner.size());
    for (const u32 corner : numbering_.firstCorner)
        positions.push_back(positionOfCorner_[corner]);
    return positions;
}

void SingleIndexConversion::gatherJointsSets() {
    const u32 setCount = getListCount(mesh_, mesh_schema::n_jointsSets);
    if (setCount == 0)
        return;
    const vector<u32> positions = positionsOfVertices();
    for (u32 i = 0; i < setCount; ++i)
        if (AttribMap* set = findListItem(mesh_, mesh_schema::n_jointsSets, i))
            rewriteJointsSet(*set, i, name_, channels_[0].count, positions, edit_);
}

void SingleIndexConversion::keepOrigins() {
    if (!isMorphBase_) {
        edit_.erase(mesh_, vertexCornersName());
        edit_.erase(mesh_, vertexPositionsName());
        return;
    }
    edit_.replace(mesh_, vertexCornersName(),
                  makeArray(numbering_.firstCorner, base::attribTransient));
    edit_.replace(mesh_, vertexPositionsName(),
                  makeArray(positionsOfVertices(), base::attribTransient));
}

void SingleIndexConversion::eraseIndexArrays() {
    edit_.erase(mesh_, mesh_schema::n_positionIndices);
    edit_.erase(mesh_, mesh_schema::n_normalIndices);
    edit_.erase(mesh_, mesh_schema::n_tangentIndices);
    const auto eraseOfSets = [&](const SchemaAttribute<Items>& list, name_id indices) {
        const u32 setCount = getListCount(mesh_, list);
        for (u32 i = 0; i < setCount; ++i)
            if (AttribMap* set = findListItem(mesh_, list, i))
                edit_.erase(*set, indices);
    };
    eraseOfSets(mesh_schema::n_uvSets, meshUVSet_schema::n_indices);
    eraseOfSets(mesh_schema::n_colorSets, meshColorSet_schema::n_indices);
    // Triangles made before address the former vertices.
    edit_.erase(mesh_, mesh_schema::n_triIndices);
}

void SingleIndexConversion::removeTriangleRanges() {
    const u32 primitiveCount = getListCount(mesh_, mesh_schema::n_primitives);
    for (u32 i = 0; i < primitiveCount; ++i) {
        AttribMap* primitive = findListItem(mesh_, mesh_schema::n_primitives, i);
        if (!primitive)
            continue;
        primitive->removeAttribute(meshPrimitive_schema::n_triIndexStart);
        primitive->removeAttribute(meshPrimitive_schema::n_triIndexCount);
    }
}

} // namespace

bool convertToSingleIndex(AttribMap& mesh, bool isMorphBase) {
    return !hasOwnIndices(mesh) || SingleIndexConversion(mesh, isMorphBase).run();
}

VertexOrigins findVertexOrigins(const AttribMap& mesh) {
    const auto* positions = find(mesh, mesh_schema::n_positions);
    const auto* corners = mesh.findVecAttribute<u32>(vertexCornersName());
    const auto* origins = mesh.findVecAttribute<u32>(vertexPositionsName());
    const auto fits = [&](const vector<u32>* array) {
        return array && positions && array->size() == positions->size();
    };
    return fits(corners) && fits(origins) ? VertexOrigins{corners, origins} : VertexOrigins();
}

} // namespace scene
