// Random forms through set and get: valid ones read back as they were sent, damaged ones change
// nothing or end in one of the known ways.
#include <gtest/gtest.h>

#include <iostream>
#include <random>
#include <string>
#include <vector>

#include "tests/src/ModuleTest.h"
#include "tests/src/TypedHandlers.h"

namespace fakes {
namespace {

constexpr unsigned kSeed = 20260717;
constexpr int kRounds = 4000;
// Levels of nesting that jsoncpp's reader does not take.
constexpr int kTooDeep = 1500;

constexpr const char* kKinds[] = {"beep", "script", "service", "recycle"};

class FormRoundTrip : public ModuleTest {
  protected:
    void SetUp() override {
        std::cout << "seed " << kSeed << '\n';
        for (const char* id : {"mail", "photo", "it's \"odd\""}) {
            ORVAPackageTool::PackageInfo info;
            info.displayName = std::string("The ") + id;
            info.startable = true;
            platform.packages[id] = info;
        }
        platform.shares = {"docs", "home"};
    }

    // --- Chance ---
    int Below(int bound) { return std::uniform_int_distribution<int>(0, bound - 1)(random); }
    bool Coin() { return Below(2) == 1; }

    std::string Text() {
        static const std::vector<std::string> kParts = {
            "a",  "B",  "7",  " ",  "-", "'", "\"",    "\\",       "$",
            "`",  ";",  "\n", "\t", "#", ":", "#a:b#", "\xC3\xA4", "\xF0\x9D\x84\x9E",
            "on", "no", "yes"};
        std::string text;
        for (int parts = Below(6); parts > 0; --parts) {
            text += kParts[static_cast<std::size_t>(Below(static_cast<int>(kParts.size())))];
        }
        return text;
    }

    Json::Value Anything(int depth = 0) {
        switch (Below(depth < 2 ? 10 : 8)) {
            case 0:
                return {};
            case 1:
                return Coin();
            case 2:
                return Below(2000) - 1000;
            case 3:
                return Json::Value(static_cast<Json::Int64>(random()));
            case 4:
                return Json::Value(static_cast<Json::UInt64>(random()));
            case 5:
                return (Below(2000) - 1000) / 8.0;
            case 6:
                return Coin() ? 1e300 : -1e300;
            case 7:
                return Text();
            case 8: {
                Json::Value list(Json::arrayValue);
                for (int count = Below(3); count > 0; --count) {
                    list.append(Anything(depth + 1));
                }
                return list;
            }
            default: {
                Json::Value object(Json::objectValue);
                for (int count = Below(3); count > 0; --count) {
                    object[Text()] = Anything(depth + 1);
                }
                return object;
            }
        }
    }

    // --- Valid forms ---
    Json::Value RecycleForm() {
        Json::Value form;
        Json::Value& shares = form["clean_share_policy"];
        shares["clean_all"] = Coin();
        shares["shares"] = Json::Value(Json::arrayValue);
        for (int count = 1 + Below(3); count > 0; --count) {
            shares["shares"].append("share" + Text());
        }
        Json::Value& files = form["clean_file_policy"];
        switch (Below(3)) {
            case 0:
                files["policy"] = "size";
                files["size"] = static_cast<Json::Int64>(random());
                files["sort_type"] = Below(2);
                break;
            case 1:
                files["policy"] = "time";
                files["time"] = Below(1000);
                break;
            default:
                files["policy"] = "clean_all";
        }
        Json::Value& rules = files["reserve_policy"];
        for (const char* rule : {"size_greater", "size_smaller"}) {
            rules[std::string(rule) + "_check"] = Coin();
            if (rules[std::string(rule) + "_check"].asBool()) {
                rules[rule] = Below(10000);
            }
        }
        rules["extension_check"] = Coin();
        if (rules["extension_check"].asBool()) {
            rules["extension"] = Json::Value(Json::arrayValue);
            for (int count = Below(3); count > 0; --count) {
                Json::Value extension;
                extension["file_ext"] = "e" + Text();
                rules["extension"].append(extension);
            }
        }
        return form;
    }

    // Every entry of the blank form with a choice of its own.
    Json::Value ServiceForm() {
        static const Json::Value kBlank =
            Result(Call("get", R"({"id":-1,"type":"service"})"))["extra"];
        Json::Value form = kBlank;
        form["action"] = Coin() ? "start" : "stop";
        for (Json::Value& service : form["services"]) {
            service["enable"] = Coin();
        }
        return form;
    }

    Json::Value Form(const std::string& kind) {
        Json::Value form;
        if (kind == "recycle") {
            return RecycleForm();
        }
        if (kind == "service") {
            return ServiceForm();
        }
        if (kind == "beep") {
            form["beep_duration"] = Coin() ? Json::Value(static_cast<Json::Int64>(random()))
                                           : Json::Value(std::to_string(Below(1000)));
        } else {
            form["script"] = Text();
        }
        form["more"] = Anything();
        return form;
    }

    // Parameters of set and create, without the id or the kind.
    Json::Value Parameters(const Json::Value& form) {
        Json::Value parameters;
        parameters["name"] = "n" + Text();
        parameters["owner"] = "eva";
        parameters["enable"] = Coin();
        parameters["schedule"]["minute"] = Below(60);
        parameters["schedule"]["week_day"] = std::to_string(Below(7));
        parameters["schedule"]["repeat_date"] = "never";
        parameters["extra"] = form;
        return parameters;
    }

    // --- Damage ---
    // A random value inside `value`, or itself.
    Json::Value& SomewhereIn(Json::Value& value) {
        if (value.empty() || !(value.isObject() || value.isArray()) || Below(4) == 0) {
            return value;
        }
        auto at = value.begin();
        std::advance(at, Below(static_cast<int>(value.size())));
        return SomewhereIn(*at);
    }

    void Damage(Json::Value& parameters) {
        Json::Value& place = SomewhereIn(parameters);
        if (&place == &parameters || (place.isObject() && Coin())) {
            if (!place.empty() && Coin()) {
                const std::vector<std::string> names = place.getMemberNames();
                place.removeMember(
                    names[static_cast<std::size_t>(Below(static_cast<int>(names.size())))]);
            } else {
                place[Coin() ? "enableRecycle" : Text()] = Anything();
            }
        } else {
            place = Anything();
        }
    }

    static bool IsStructure(const Json::Value& value) {
        return value.isArray() || value.isObject();
    }

    // Whether jsoncpp may throw for these parameters: those of a wrong type that the forms read as
    // text, number or section.
    static bool MayThrow(const std::string& kind, const Json::Value& parameters) {
        const auto isSection = [](const Json::Value& value) {
            return value.isNull() || value.isObject();
        };
        const Json::Value& extra = parameters["extra"];
        const Json::Value& enable = parameters["enable"];
        if (IsStructure(parameters["id"]) || enable.isString() || IsStructure(enable) ||
            !isSection(parameters["schedule"]) || !isSection(extra)) {
            return true;
        }
        return (kind == "beep" && !extra["beep_duration"].isNumeric() &&
                !extra["beep_duration"].isNull() && !extra["beep_duration"].isBool()) ||
               (kind == "script" && IsStructure(extra["script"])) ||
               (kind == "recycle" && IsStructure(extra["enableRecycle"]));
    }

    // The document of a successful answer, null of any other.
    static Json::Value Result(const std::string& answer) {
        const std::string success = "success ";
        return answer.compare(0, success.size(), success) == 0
                   ? Document(answer.substr(success.size()))
                   : Json::Value();
    }

    std::string Everything() const {
        std::string text;
        for (const auto& [id, task] : platform.tasks) {
            text += task.ToText() + "\n";
        }
        return text;
    }

    std::mt19937_64 random{kSeed};
};

TEST_F(FormRoundTrip, ValidFormsReadBackAsTheyWereSent) {
    std::vector<int> ids;
    for (const char* kind : kKinds) {
        Json::Value parameters = Parameters(Form(kind));
        parameters["type"] = kind;
        const Json::Value created = Result(Call("create", Compact(parameters)));
        ASSERT_TRUE(created["id"].isInt()) << Compact(parameters);
        ids.push_back(created["id"].asInt());
    }
    for (int round = 0; round < kRounds; ++round) {
        const auto chosen = static_cast<std::size_t>(Below(static_cast<int>(ids.size())));
        Json::Value parameters = Parameters(Form(kKinds[chosen]));
        parameters["id"] = ids[chosen];
        const std::string sent = Compact(parameters);
        ASSERT_EQ(Call("set", sent), "success {\"id\":" + std::to_string(ids[chosen]) + "}")
            << sent;
        const Json::Value shown =
            Result(Call("get", "{\"id\":" + std::to_string(ids[chosen]) + "}"));
        ASSERT_EQ(Compact(shown["extra"]), Compact(parameters["extra"])) << sent;
        ASSERT_EQ(Compact(shown["schedule"]), Compact(parameters["schedule"])) << sent;
        ASSERT_EQ(shown["name"], parameters["name"]) << sent;
        ASSERT_EQ(shown["enable"], parameters["enable"]) << sent;
        ASSERT_EQ(shown["type"].asString(), kKinds[chosen]) << sent;
        platform.ClearJournal();
    }
}

TEST_F(FormRoundTrip, DamagedFormsAreServedWhollyOrChangeNothing) {
    std::vector<int> ids;
    for (const char* kind : kKinds) {
        Json::Value parameters = Parameters(Form(kind));
        parameters["type"] = kind;
        ids.push_back(Result(Call("create", Compact(parameters)))["id"].asInt());
    }
    int served = 0;
    int refused = 0;
    int thrown = 0;
    for (int round = 0; round < kRounds; ++round) {
        const auto chosen = static_cast<std::size_t>(Below(static_cast<int>(ids.size())));
        const std::string kind = kKinds[chosen];
        const bool creates = Coin();
        Json::Value parameters = Parameters(Form(kind));
        for (int times = 1 + Below(3); times > 0; --times) {
            Damage(parameters);
        }
        if (creates) {
            parameters["type"] = kind;
        } else {
            parameters["id"] = ids[chosen];
        }
        const std::string sent = Compact(parameters);
        const std::string before = Everything();
        const std::map<int, Task> tasksBefore = platform.tasks;
        try {
            const std::string answer = Call(creates ? "create" : "set", sent);
            const Json::Value result = Result(answer);
            if (result.isNull()) {
                ++refused;
                ASSERT_EQ(Everything(), before) << sent;
            } else {
                ++served;
                const Json::Value shown = Result(Call("get", Compact(result)));
                ASSERT_EQ(shown["type"].asString(), kind) << sent;
            }
        } catch (const Json::LogicError& error) {
            ++thrown;
            ASSERT_TRUE(MayThrow(kind, parameters)) << sent << ": " << error.what();
            ASSERT_EQ(Everything(), before) << sent;
        }
        ASSERT_EQ(platform.Leftovers(), "") << sent;
        platform.tasks = tasksBefore;
        platform.ClearJournal();
    }
    std::cout << served << " served, " << refused << " refused, " << thrown << " thrown\n";
    EXPECT_GT(served, kRounds / 10);
    EXPECT_GT(refused, kRounds / 50);
    EXPECT_GT(thrown, kRounds / 50);
}

TEST_F(FormRoundTrip, DamagedStoredSectionsNeverEndInAnException) {
    const std::vector<std::string> namespaces = {
        "ORVA.ZUM.TaskScheduler.Beep", "ORVA.ZUM.TaskScheduler.Script",
        "ORVA.ZUM.TaskScheduler.Service", "ORVA.ZUM.TaskScheduler.Recycle"};
    for (int round = 0; round < kRounds; ++round) {
        const auto chosen = static_cast<std::size_t>(Below(4));
        Json::Value parameters = Parameters(Form(kKinds[chosen]));
        parameters["type"] = kKinds[chosen];
        const int id = Result(Call("create", Compact(parameters)))["id"].asInt();
        Task& task = platform.tasks[id];
        const int damage = Below(8);
        if (damage < 2) {
            task.appArgs.resize(task.appArgs.size() / 2);
        } else if (damage == 2) {
            task.appArgs = std::string(kTooDeep, '[');
        } else {
            Json::Value section = Document(task.appArgs);
            SomewhereIn(section) = Anything();
            SomewhereIn(section) = Anything();
            task.appArgs = Compact(section);
        }
        ASSERT_EQ(task.app, namespaces[chosen]);
        const std::string stored = task.appArgs;
        ASSERT_NO_THROW(Call("get", "{\"id\":" + std::to_string(id) + "}")) << stored;
        ASSERT_NO_THROW(Call("set", "{\"id\":" + std::to_string(id) + "}")) << stored;
        ASSERT_EQ(platform.Leftovers(), "") << stored;
        platform.tasks.clear();
        platform.ClearJournal();
    }
}

TEST_F(FormRoundTrip, StoredSectionsNestedTooDeepCountAsEmptyOnes) {
    const std::vector<std::string> namespaces = {
        "ORVA.ZUM.TaskScheduler.Beep", "ORVA.ZUM.TaskScheduler.Script",
        "ORVA.ZUM.TaskScheduler.Service", "ORVA.ZUM.TaskScheduler.Recycle"};
    const std::vector<std::string> shown = {
        "null", "null", R"(error 117 {"msg":"Failed to convert app object"})",
        R"({"clean_file_policy":{"policy":"clean_all","reserve_policy":{"extension_check":false,)"
        R"("size_greater_check":false,"size_smaller_check":false}},)"
        R"("clean_share_policy":{"clean_all":false,"shares":null}})"};
    const std::vector<std::string> set = {R"(success {"id":5})", R"(success {"id":5})",
                                          R"(error 117 {"msg":"Invalid (app) object"})",
                                          R"(error 117 {"msg":"Invalid (app) object"})"};
    for (std::size_t kind = 0; kind < namespaces.size(); ++kind) {
        platform.AddTask(StoredTask(5, namespaces[kind], std::string(kTooDeep, '[')));
        const std::string answer = Call("get", R"({"id":5})");
        const Json::Value document = Result(answer);
        EXPECT_EQ(document.isNull() ? answer : Compact(document["extra"]), shown[kind])
            << kKinds[kind];
        EXPECT_EQ(Call("set", R"({"id":5,"name":"Job","extra":{}})"), set[kind]) << kKinds[kind];
    }
}

}  // namespace
}  // namespace fakes
