#pragma once

#include <OrvanCore/String.h>
#include <TessaraMathSupport/Export.h>

namespace TSR {

/// The message of the exception that ends a cancelled job: "job cancelled".
extern TESSARAMATHSUPPORT_EXPORT Orvan::String const exceptionMessage;

}
