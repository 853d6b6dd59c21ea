#pragma once
#include "HostExport.h"

// Small text services.
class VORANT_HOST_API UT_STR {
public:
    // 0 when equal ignoring ASCII letter case; otherwise <0 / >0 like strcmp.
    // A null text sorts before every other text and equals only null.
    static int ICompare(const char* a, const char* b);
    // Non-zero when text matches the wildcard pattern ('*' any run, '?' one
    // character), ignoring letter case. A null text or pattern never matches.
    static int IMatch(const char* text, const char* pattern);
    // A copy from the host's text pool (see Port::internText): never freed
    // by the caller.
    static char* Dup(const char* text);
};

class VORANT_HOST_API Port_Env {
public:
    // The variable's value, or null when it is not defined.
    static const char* GetEnv(const char* name);
};
