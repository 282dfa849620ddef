#include <TessaraMathSupport/ExceptionMessage.h>

namespace TSR {

Orvan::String const exceptionMessage = "job cancelled";

}
