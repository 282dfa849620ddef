#include "Readers.h"

#include <TessaraGeometry/Names.h>

namespace ModelingProgram {

using Tessara::Math::float3;

GeometryFile readXyz(InputFile const& file)
{
    TextScanner in(file, 0, TextScanner::Syntax::Comments);
    GeometryBuilder builder(in);
    Orvan::Array<float3> normals;
    for (in.skipEmptyLines(); !in.atEnd(); in.skipEmptyLines()) {
        float values[6];
        unsigned int count = 0;
        for (; !in.atLineEnd(); ++count) {
            float const value = in.number<float>("a coordinate");
            if (count < 6)
                values[count] = value;
        }
        if (count != 3 && count != 6)
            in.refuse("there are " + std::to_string(count) + " values; 3 make a point, 6 a point and its normal");
        builder.addPoint({values[0], values[1], values[2]});
        if (count == 6)
            normals.append({values[3], values[4], values[5]});
        if (!normals.empty() && normals.size != builder.pointCount())
            in.refuse("some points have normals and some have none");
        in.nextLine();
    }
    if (!normals.empty())
        builder.addProperty<float3>("normal", Tessara::Geometry::sPointComp, std::move(normals));
    return std::move(builder).finish("XYZ");
}

}
