#pragma once

#include <memory>
#include <string>

#include "appliance/webapi/Dispatcher.h"
#include "appliance/webapi/ModuleLoader.h"
#include "tests/appliance/runs/RunTest.h"

// A test with the shipped API modules in it, on an appliance and a history of its own.
class ModuleTest : public RunTest {
  protected:
    ModuleTest();

    // What the server would answer, as it would send it.
    std::string Ask(const std::string& api, const std::string& method,
                    const std::string& body = "{}", const std::string& language = "en") const;

    // The answer of a method that refuses.
    static std::string Refusal(int code, const std::string& message);

  private:
    std::unique_ptr<orva::ModuleLoader> modules;
};
