#pragma once

#include <OrvanCore/String.h>

namespace TSR {

extern Orvan::String const exceptionMessage;

}
