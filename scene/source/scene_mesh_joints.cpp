#include "scene_mesh_joints.h"

#include "b_log.h"
#include "scene_mesh_edit.h"
#include "scene_schema.h"

#include <algorithm>

namespace scene {

using base::AttribMap;
using base::u16;
using base::u32;
using base::u64;
using base::u8;
using base::vector;

namespace {

/// Joint entries that a rewritten set may hold: where many vertices share a position with very
/// many joints, a large array would come out of a small one.
constexpr u64 maxEntryCount = u64(1) << 28;

/// Where the entries of each position start, with the end of the last behind them.
template <class T>
vector<u64> findStarts(const vector<T>& counts) {
    vector<u64> starts;
    starts.reserve(counts.size() + 1);
    u64 sum = 0;
    for (const T count : counts) {
        starts.push_back(sum);
        sum += count;
    }
    starts.push_back(sum);
    return starts;
}

template <class T>
vector<T> gatherCounts(const vector<T>& counts, const vector<u32>& positionOfVertex) {
    vector<T> result;
    result.reserve(positionOfVertex.size());
    for (const u32 position : positionOfVertex)
        result.push_back(counts[position]);
    return result;
}

template <class T>
vector<T> gatherEntries(const vector<T>& entries, const vector<u64>& starts,
                        const vector<u32>& positionOfVertex, u64 entryCount) {
    vector<T> result;
    result.resizeUninitialized(entryCount);
    T* to = result.data();
    for (const u32 position : positionOfVertex)
        to = std::copy(entries.begin() + starts[position], entries.begin() + starts[position + 1],
                       to);
    return result;
}

template <class T>
std::unique_ptr<base::Attribute> makeArray(vector<T> values) {
    return std::make_unique<base::TypedVectorAttribute<T>>(std::move(values));
}

} // namespace

void rewriteJointsSet(AttribMap& set, u32 setIndex, const base::string& meshName, u32 positionCount,
                      const vector<u32>& positionOfVertex, MeshEdit& edit) {
    const base::name_id countsName = meshJointsSet_schema::n_jointCounts;
    vector<u64> starts;
    u64 entryCount = 0;
    visitVector<u16, u8, u32>(set, countsName, [&]<class T>(const vector<T>& counts) {
        if (counts.size() != positionCount) {
            base::log().log(base::logScene, base::logError,
                            "{}| Wrong joint counts in vertex weights at index {}! Expected {} "
                            "elements, found {}.",
                            meshName, setIndex, positionCount, counts.size());
            edit.erase(set, countsName);
            return;
        }
        starts = findStarts(counts);
        vector<T> newCounts = gatherCounts(counts, positionOfVertex);
        for (const T count : newCounts)
            entryCount += count;
        edit.replace(set, countsName, makeArray(std::move(newCounts)));
    });
    if (starts.empty())
        return;

    const auto rewrite = [&](base::name_id name, const auto& entries) {
        if (starts.back() > entries.size() || entryCount > maxEntryCount)
            edit.erase(set, name);
        else
            edit.replace(set, name,
                         makeArray(gatherEntries(entries, starts, positionOfVertex, entryCount)));
    };
    visitVector<u32, u16, u8>(set, meshJointsSet_schema::n_indices, [&](const auto& entries) {
        rewrite(meshJointsSet_schema::n_indices, entries);
    });
    visitVector<float>(set, meshJointsSet_schema::n_weights, [&](const auto& entries) {
        rewrite(meshJointsSet_schema::n_weights, entries);
    });
}

} // namespace scene
