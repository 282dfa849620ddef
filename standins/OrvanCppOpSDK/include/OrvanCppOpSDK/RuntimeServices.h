#pragma once

namespace Orvan {

/// What the host offers to a running operation. Opaque: operations hand a pointer on, which may be null, and never look
/// behind it.
class RuntimeServices;

}
