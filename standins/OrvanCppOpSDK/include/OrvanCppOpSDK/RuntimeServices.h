#pragma once

namespace Orvan {

/// What the host offers to a running operation. Opaque: operations accept a pointer, which may be null, and never
/// dereference it.
class RuntimeServices;

}
