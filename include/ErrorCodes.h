// The codes that the user interface is told, besides a short text under "msg".
#pragma once

// The task store could not provide, convert or save a task, or a list of them.
constexpr int kStoreFailed = 117;
// A parameter is missing, malformed, or names an unknown kind of task.
constexpr int kBadParameter = 4800;
// A task could not be loaded, or its kind not found.
constexpr int kLoadFailed = 4801;
constexpr int kDeleteFailed = 4802;
constexpr int kRunFailed = 4803;
// A changed task could not be saved.
constexpr int kSaveFailed = 4804;
