// The shadow filter's chain: source, cRGB2LAB, step 1, step 2, cLAB2RGB, step 3, step 4.
#pragma once

#include <cstddef>
#include <string>

class cRGB32FilterAction;
class cStep1;
class cStep2;
class cStep3;
class cStep4;

// A new action whose chain runs the four steps between the Lab conversions. The chain's nodes hold
// the references to the steps and converters; deleting the action deletes them all (a step with no
// other reference goes with it).
cRGB32FilterAction* buildShadowAction(cStep1* step1, cStep2* step2, cStep3* step3, cStep4* step4);

// The settings text ("Parameter0" .. "Parameter57", each " name value ") of an action's chain,
// without the signature.
std::string writeShadowParameters(cRGB32FilterAction& action);
// Writes at most capacity - 1 characters and a terminating zero; returns the length written.
size_t writeShadowParameters(cRGB32FilterAction& action, char* buffer, size_t capacity);
// Reads a zero-terminated settings text (signature already removed) into the chain's steps.
void readShadowParameters(cRGB32FilterAction& action, const char* text);
