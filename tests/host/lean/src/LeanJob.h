#pragma once

namespace LeanHost {

/// For tests: what `Orvan::isJobCancelled` returns.
void setJobCancelled(bool cancelled);

}
