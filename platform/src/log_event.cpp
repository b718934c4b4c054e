// The system event log: the platform action "VORNLogSet1".
#include "vornplatform/log_event.h"

#include <cstdio>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/action.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

int VORNLogSet1(int level, int kind, unsigned int id, const char* a, const char* b, const char* c,
                const char* d) {
  return vornplatform::internal::NoThrow(-1, [&]() -> int {
    char idText[16];
    std::snprintf(idText, sizeof idText, "0x%08x", id);
    std::vector<std::string> args{std::to_string(level), std::to_string(kind), idText};
    for (const char* text : {a, b, c, d}) args.push_back(text == nullptr ? "" : text);
    const int rc = vornplatform::RunAction("VORNLogSet1", args);
    if (rc == 0) return 0;
    if (rc > 0) {
      VORN_LOG(LOG_ERR, "platform action VORNLogSet1 exited with %d", rc);
      VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    }
    return -1;
  });
}
