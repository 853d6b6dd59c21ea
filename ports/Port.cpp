#include "ports/Port.h"

namespace vorant::ports {

Port::~Port() = default;

}  // namespace vorant::ports
