// tdm demo: the main job on a built-in sample.

#include "commands.h"

namespace tdm {

int RunDemo(DemoOptions const & /*demo*/, CommonOptions const & /*options*/) {
  throw Failure(kExitUsage, "the demo is not built yet");
}

} // namespace tdm
