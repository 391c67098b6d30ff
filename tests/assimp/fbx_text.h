#pragma once

#include <algorithm>
#include <string>

namespace test_support {

/// The parts of a small FBX file that differ between tests.
struct FbxText {
    /// Up, front and right axis with sign, centimetres per unit.
    int up = 1, upSign = 1, front = 2, frontSign = 1, right = 0, rightSign = 1;
    std::string unit = "1";
    std::string layers;     ///< elements of the geometry, a square from the origin in the XY plane
    std::string properties; ///< of the model "panel", which has the geometry
    bool hasTwins = false;  ///< "panel" has two children and not one
    /// Further objects and their connections. A material for "panel" has the number 40.
    std::string objects{}, connections{};

    std::string text() const {
        const auto number = [](const char* name, int value) {
            return std::string("P: \"") + name + "\", \"int\", \"Integer\", \"\"," +
                   std::to_string(value) + "\n";
        };
        return "; FBX 7.4.0 project file\n"
               "FBXHeaderExtension:  {\nFBXHeaderVersion: 1003\nFBXVersion: 7400\n}\n"
               "GlobalSettings:  {\nVersion: 1000\nProperties70:  {\n" +
               number("UpAxis", up) + number("UpAxisSign", upSign) + number("FrontAxis", front) +
               number("FrontAxisSign", frontSign) + number("CoordAxis", right) +
               number("CoordAxisSign", rightSign) +
               "P: \"UnitScaleFactor\", \"double\", \"Number\", \"\"," + unit +
               "\n}\n}\nObjects:  {\n"
               "Geometry: 10, \"Geometry::square\", \"Mesh\" {\n"
               "Vertices: *12 {\na: 0,0,0,1,0,0,1,1,0,0,1,0\n}\n"
               "PolygonVertexIndex: *4 {\na: 0,1,2,-4\n}\nGeometryVersion: 124\n" +
               layers +
               "}\n"
               "Model: 20, \"Model::panel\", \"Mesh\" {\nVersion: 232\nProperties70:  {\n" +
               properties +
               "}\n}\n"
               "Model: 21, \"Model::child\", \"Null\" {\nVersion: 232\n}\n" +
               (hasTwins ? "Model: 22, \"Model::twin\", \"Null\" {\nVersion: 232\n}\n" : "") +
               objects + "}\nConnections:  {\nC: \"OO\",20,0\nC: \"OO\",10,20\nC: \"OO\",21,20\n" +
               (hasTwins ? "C: \"OO\",22,20\n" : "") +
               (objects.empty() ? "" : "C: \"OO\",40,20\n") + connections + "}\n";
    }

    /// Adds the material "paint", and texture coordinates.
    void addMaterial(const std::string& values) {
        layers += "LayerElementUV: 0 {\nVersion: 101\nName: \"uv\"\n"
                  "MappingInformationType: \"ByPolygonVertex\"\n"
                  "ReferenceInformationType: \"Direct\"\nUV: *8 {\na: 0,0,1,0,1,1,0,1\n}\n}\n"
                  "LayerElementMaterial: 0 {\nVersion: 101\nName: \"\"\n"
                  "MappingInformationType: \"AllSame\"\n"
                  "ReferenceInformationType: \"IndexToDirect\"\nMaterials: *1 {\na: 0\n}\n}\n"
                  "Layer: 0 {\nVersion: 100\nLayerElement:  {\nType: \"LayerElementMaterial\"\n"
                  "TypedIndex: 0\n}\nLayerElement:  {\nType: \"LayerElementUV\"\n"
                  "TypedIndex: 0\n}\n}\n";
        objects += "Material: 40, \"Material::paint\", \"\" {\nVersion: 102\n"
                   "ShadingModel: \"phong\"\nProperties70:  {\n" +
                   values + "}\n}\n";
    }
    /// Adds a texture, and a picture inside the file if `content`, in base64, is not empty.
    void addTexture(int id, const std::string& file, const std::string& use,
                    const std::string& values = "", const std::string& content = "") {
        const std::string number = std::to_string(id), video = std::to_string(id + 1000);
        objects += "Texture: " + number + ", \"Texture::t\", \"\" {\nFileName: \"" + file +
                   "\"\nRelativeFilename: \"" + file + "\"\nProperties70:  {\n" + values + "}\n}\n";
        connections += "C: \"OP\"," + number + ",40, \"" + use + "\"\n";
        if (content.empty())
            return;
        objects += "Video: " + video + ", \"Video::v\", \"Clip\" {\nType: \"Clip\"\nFileName: \"" +
                   file + "\"\nRelativeFilename: \"" + file + "\"\nContent: ,\n\"" + content +
                   "\"\n}\n";
        connections += "C: \"OO\"," + video + "," + number + "\n";
    }
    static std::string colorProperty(const std::string& name, const std::string& values) {
        return "P: \"" + name + "\", \"Color\", \"\", \"A\"," + values + "\n";
    }
    static std::string numberProperty(const std::string& name, const std::string& value) {
        return "P: \"" + name + "\", \"Number\", \"\", \"A\"," + value + "\n";
    }
    static std::string vectorProperty(const std::string& name, const std::string& values) {
        return "P: \"" + name + "\", \"Vector3D\", \"Vector\", \"\"," + values + "\n";
    }
    /// An element with one value for each corner. `array` names its values.
    static std::string layer(const std::string& kind, const std::string& array, int index,
                             const std::string& name, const std::string& values) {
        return "LayerElement" + kind + ": " + std::to_string(index) + " {\nVersion: 101\nName: \"" +
               name +
               "\"\nMappingInformationType: \"ByPolygonVertex\"\n"
               "ReferenceInformationType: \"Direct\"\n" +
               array + ": *" + std::to_string(std::count(values.begin(), values.end(), ',') + 1) +
               " {\na: " + values + "\n}\n}\n" + "Layer: " + std::to_string(index) +
               " {\nVersion: 100\nLayerElement:  {\nType: \"LayerElement" + kind +
               "\"\nTypedIndex: " + std::to_string(index) + "\n}\n}\n";
    }
};

} // namespace test_support
