#pragma once

#include <gmock/gmock.h>

#include <string>

#include "platform/webapi.h"
#include "tests/fakes/PlatformTest.h"

inline fakes::Task TaskWithId(int id) {
    fakes::Task task;
    task.id = id;
    task.name = "task " + std::to_string(id);
    task.app = "ORVA.ZUM.TaskScheduler.Script";
    return task;
}

// A test that calls the module as the server does: through the method table.
class ModuleTest : public fakes::PlatformTest {
  protected:
    // Calls the method with the parameters of a JSON text; the answer as fakes::Answer gives it.
    static std::string Call(const std::string& method, const std::string& parameters) {
        ORVA::APIRequest request = fakes::Request(parameters);
        ORVA::APIResponse response;
        for (const ORVA::APITableRow* row = GetAPITable(); row->apiName != nullptr; ++row) {
            if (method == row->methodName) {
                row->method(&request, &response);
            }
        }
        return fakes::Answer(response);
    }
};
