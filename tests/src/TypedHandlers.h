// What the tests of the typed handlers share.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "include/TaskSchedulerBasicHandler.h"
#include "tests/fakes/PlatformTest.h"

namespace fakes {

// The answer of `Handler` to one call.
template <class Handler>
std::string Serve(const char* method, const std::string& parameters) {
    ORVA::APIRequest request = Request(parameters);
    ORVA::APIResponse response;
    Handler handler(&request, &response);
    handler.Process_v1(method);
    return Answer(response);
}

// A stored task "Job" of the namespace `app` with these application arguments.
inline Task StoredTask(int id, const std::string& app, const std::string& appArgs) {
    Task task;
    task.id = id;
    task.name = "Job";
    task.app = app;
    task.appArgs = appArgs;
    task.schedule = Document(R"({"min":30,"repeat":"never","week_name":"1,3"})");
    return task;
}

}  // namespace fakes
