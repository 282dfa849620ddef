#pragma once

namespace Orvan {

bool isJobCancelled();

}
