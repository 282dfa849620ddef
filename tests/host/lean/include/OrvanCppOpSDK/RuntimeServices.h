#pragma once

namespace Orvan {

class RuntimeServices;

}
