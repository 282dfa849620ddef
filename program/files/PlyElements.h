#pragma once

#include "GeometryBuilder.h"
#include "PlyHeader.h"

namespace ModelingProgram {

/// Reads elements one by one, with a scanner for the encoding of the file. The uses and targets of the properties must
/// have been set.
template <class In> class PlyElementReader {
public:
    PlyElementReader(In& in, GeometryBuilder& builder)
        : in_(in)
        , builder_(builder)
    {
    }

    void read(PlyElement& element, std::uint64_t first, std::uint64_t end)
    {
        for (std::uint64_t index = first; index < end; ++index)
            readElement(element, index);
    }

private:
    static constexpr bool kIsText = std::is_same_v<In, TextScanner>;
    using Use = PlyProperty::Use;

    void readElement(PlyElement& element, std::uint64_t index)
    {
        in_.beginElement(element.name.c_str(), index);
        for (PlyProperty& property : element.properties) {
            withPlyScalar(property.type, [&]<class T>(std::type_identity<T>) {
                if (property.lengthType)
                    readList<T>(property);
                else
                    readValue<T>(property);
            });
        }
        if (element.name == "vertex")
            builder_.addPoint(position_[0], position_[1], position_[2]);
        else if (element.name == "face")
            builder_.endFace();
        in_.endElement();
    }

    template <class T> void readValue(PlyProperty& property)
    {
        if constexpr (kIsText && std::is_floating_point_v<T>) {
            if (property.use == Use::Position) {
                position_[property.axis] = in_.coordinate(property.name.c_str());
                return;
            }
        }
        T const value = in_.template number<T>(property.name.c_str());
        if (property.use == Use::Position) {
            // Beyond the range of float it becomes infinite, which the builder refuses or leaves out.
            position_[property.axis] = coordinateOf(value);
        } else if (property.use == Use::Value) {
            std::memcpy(property.target, &value, sizeof(T));
            property.target += property.stride;
        }
    }

    template <class T> void readList(PlyProperty& property)
    {
        std::uint64_t const length = readLength(property);
        in_.requirePossible(length, "values of a list", kIsText ? 2 : sizeof(T));
        if (property.use == Use::List)
            property.lengths.append(static_cast<unsigned int>(length));
        for (std::uint64_t i = 0; i < length; ++i) {
            T const value = in_.template number<T>(property.name.c_str());
            if constexpr (std::is_integral_v<T>) {
                if (property.use == Use::Indices)
                    builder_.addCorner(value);
            }
            if (property.use == Use::List) {
                std::uint64_t const size = property.values.size;
                property.values.resize(size + sizeof(T), Orvan::kUninitialized);
                std::memcpy(property.values.data + size, &value, sizeof(T));
            }
        }
    }

    std::uint64_t readLength(PlyProperty const& property)
    {
        return withPlyScalar(*property.lengthType, [&]<class T>(std::type_identity<T>) {
            T const length = in_.template number<T>(property.name.c_str());
            if (length < 0)
                in_.refuse("the list " + TextScanner::quoted(property.name) + " has a negative length");
            return static_cast<std::uint64_t>(length);
        });
    }

    In& in_;
    GeometryBuilder& builder_;
    Coordinate position_[3] = {};
};

}
