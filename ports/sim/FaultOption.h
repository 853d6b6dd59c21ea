#pragma once
// The simulator's injectable faults as the user names them ("stuck-busy",
// "fail-shift=page:3", ...). Each fault is one row of a table: its name, its
// value form, what it does and how it sets a FaultPlan; the list in
// messages and help is read from the same rows.

#include "ports/sim/FaultPlan.h"

#include <stdexcept>
#include <string>
#include <vector>

namespace vorant::sim {

struct FaultOption {
    const char* name;
    // "" for a fault that takes no value; else its form after '=' ("N").
    const char* valueForm;
    const char* purpose;
    // Sets the fault in the plan from its value text (empty when valueForm
    // is ""). Throws FaultOptionError naming what is wrong with the value.
    void (*apply)(FaultPlan& plan, const std::string& value);
};

const std::vector<FaultOption>& faultOptions();
// "stuck-busy, cancel-after=N, ...", for messages.
std::string faultList();

// Adds one fault given as NAME or NAME=VALUE. Numbers are decimal or 0x
// hex. Throws FaultOptionError for anything else.
void addFault(FaultPlan& plan, const std::string& text);
FaultPlan faultPlan(const std::vector<std::string>& texts);

class FaultOptionError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace vorant::sim
