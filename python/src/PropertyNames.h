#pragma once

#include <TessaraObject/Object.h>

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace ModelingPython {

// Names as users know them. Components are "points", "faces", "corners" and "strands", others have their own names.
// A property has the same name as in files: if a property of other elements has the name already, the key in the object
// has a prefix ("face:color"), which is not part of the name.

/// The key of a component or range in the object.
Orvan::String targetKey(std::string_view name);
std::string targetName(Orvan::String const& key);

/// The keys of the data properties of a component or range, in their order, without those of the geometry itself.
std::vector<Orvan::String> dataKeys(Tessara::Object const& object, Orvan::String const& target);

std::string propertyName(Tessara::Object const& object, Orvan::String const& key, Orvan::String const& target);

/// The key of the data property with this name; nullopt if there is none.
std::optional<Orvan::String> findDataKey(
    Tessara::Object const& object, std::string_view name, Orvan::String const& target);

/// The key for a new property with this name.
/// \throws py::value_error  if the name and the one with the prefix are taken, or names cannot have these characters
Orvan::String newKey(Tessara::Object const& object, std::string const& name, Orvan::String const& target);

/// The object without a key. A property of other elements whose key has a prefix only because of it gets its plain name.
Orvan::MutablePtr<Tessara::Object> withoutKey(Tessara::Object const& object, Orvan::String const& key);

}
