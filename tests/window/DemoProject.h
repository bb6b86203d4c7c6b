#pragma once

#include <string>

namespace windowtest {

// A project folder in a fresh temporary directory whose data, scene and picture folders are
// copies of the demo's files, made once per program and set as TESSEL_PROJECT: loading the
// demo keyset from it asks no project question.
std::string DemoProject();

}  // namespace windowtest
