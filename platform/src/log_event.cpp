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
    return vornplatform::RunStrictAction("VORNLogSet1", args);
  });
}
