#pragma once

#include <OrvanCore/String.h>
#include <TessaraMathSupport/Export.h>

namespace TSR {

/// The text of the exception that ends a cancelled job: "job cancelled".
extern TESSARAMATHSUPPORT_EXPORT Orvan::String const exceptionMessage;

}
