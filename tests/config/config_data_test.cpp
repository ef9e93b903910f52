// The configuration's data and the rules for reading the file's text, on real files in a
// temporary simulated machine: the version cases, missing, empty and malformed files, devices.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "config/configuration_data.h"
#include "config/failure.h"
#include "config/loader.h"
#include "config/lockable_file.h"
#include "config_test_support.h"
#include "json/zrjsonlh.h"

namespace {

using configtest::Details;
using configtest::failureOf;
using zrjsonconfig::ConfigurationData;
using zrjsonconfig::JsonTree;
using zrjsonconfig::LoadedConfiguration;

JsonTree parsed(const char* text) { return JsonTree(zrjsonlh::parse(text)); }

std::string printed(const cJSON* item) { return zrjsonlh::printUnformatted(item); }

std::vector<std::string> tokensInMapOrder(const ConfigurationData& data) {
    std::vector<std::string> tokens;
    for (const auto& [token, entry] : data.entries()) tokens.push_back(token);
    return tokens;
}

// The member names of "devices" in the file form: the order the file will hold them in.
std::vector<std::string> tokensInFileOrder(const ConfigurationData& data) {
    std::vector<std::string> tokens;
    const JsonTree json = data.configuredJson();
    for (const cJSON* device = cJSON_GetObjectItem(json.get(), "devices")->child; device; device = device->next)
        tokens.push_back(device->string);
    return tokens;
}

TEST(ConfigurationData, FreshDataIsVersionOneWithoutDevices) {
    const ConfigurationData data;
    EXPECT_EQ(printed(data.configuredJson().get()), R"({"version":1,"oldest_compatible_version":1,"devices":{}})");
    EXPECT_EQ(printed(data.providedJson().get()), "{}");
    EXPECT_TRUE(data.entries().empty());
    // The file form is indented text that reads back as the same JSON.
    const JsonTree back = parsed(data.configuredText().c_str());
    EXPECT_TRUE(cJSON_Compare(back.get(), data.configuredJson().get(), true));
    EXPECT_NE(data.configuredText().find('\n'), std::string::npos);
}

TEST(ConfigurationData, TokensAreOrderedByteWiseAndDevicesKeepTheOrderAdded) {
    ConfigurationData data;
    data.add("b", parsed(R"({"alias":"Dev2"})"), parsed(R"({"is_present":true})"));
    data.add("a", parsed(R"({"alias":"Dev1"})"), zrjsonconfig::newObject());
    data.add("B", zrjsonconfig::newObject(), zrjsonconfig::newObject());
    data.add("\xc3\xa9", zrjsonconfig::newObject(), zrjsonconfig::newObject());  // é sorts after ASCII
    EXPECT_EQ(tokensInMapOrder(data), (std::vector<std::string>{"B", "a", "b", "\xc3\xa9"}));
    EXPECT_EQ(tokensInFileOrder(data), (std::vector<std::string>{"b", "a", "B", "\xc3\xa9"}));
    EXPECT_EQ(data.find("A"), nullptr);  // tokens are case-sensitive
    ASSERT_NE(data.find("b"), nullptr);
    EXPECT_EQ(printed(data.find("b")->configured()), R"({"alias":"Dev2"})");
    EXPECT_EQ(printed(data.providedJson().get()), R"({"b":{"is_present":true},"a":{},"B":{},"é":{}})");

    // A removed device that comes back goes to the end of the file's order.
    data.remove("b");
    EXPECT_EQ(data.find("b"), nullptr);
    data.add("b", zrjsonconfig::newObject(), zrjsonconfig::newObject());
    EXPECT_EQ(tokensInFileOrder(data), (std::vector<std::string>{"a", "B", "\xc3\xa9", "b"}));
}

TEST(ConfigurationData, AddAndRemoveFailuresLeaveTheDataAsItWas) {
    ConfigurationData data;
    data.add("tok", parsed(R"({"alias":"first"})"), zrjsonconfig::newObject());

    const Details duplicate = failureOf([&] { data.add("tok", parsed(R"({"alias":"second"})"), zrjsonconfig::newObject()); });
    EXPECT_EQ(duplicate.code, -52013);
    EXPECT_EQ(duplicate.constant, "zrapalerr_objectNameCollision");
    EXPECT_EQ(duplicate.translator, "vllator_tiktal");
    EXPECT_EQ(duplicate.records, (std::vector<std::string>{"kUsageTypeToken=tok"}));

    const Details missing = failureOf([&] { data.remove("TOK"); });
    EXPECT_EQ(missing.code, static_cast<std::int32_t>(0xBFFA917F));
    EXPECT_EQ(missing.constant, "zrvll::kErrorDeviceEntryNotFound");
    EXPECT_EQ(missing.records, (std::vector<std::string>{"kUsageTypeToken=TOK"}));

    EXPECT_EQ(failureOf([&] { data.add("other", parsed("[]"), zrjsonconfig::newObject()); }).code, -52004);
    EXPECT_EQ(failureOf([&] { data.add("other", zrjsonconfig::newObject(), JsonTree()); }).code, -52004);

    EXPECT_EQ(printed(data.configuredJson().get()),
              R"({"version":1,"oldest_compatible_version":1,"devices":{"tok":{"alias":"first"}}})");
    EXPECT_EQ(printed(data.providedJson().get()), R"({"tok":{}})");
}

TEST(ConfigurationData, EntriesAreSharedButCopiesShareNothing) {
    ConfigurationData data;
    data.add("t", parsed(R"({"alias":"Dev1"})"), zrjsonconfig::newObject());

    // What a provider writes into an entry it was given is the data's.
    const std::shared_ptr<zrjsonconfig::DeviceEntry> entry = data.find("t");
    cJSON_AddStringToObject(entry->configured(), "serial_number", "1A2B");
    EXPECT_EQ(printed(data.find("t")->configured()), R"({"alias":"Dev1","serial_number":"1A2B"})");

    ConfigurationData copy = data;
    ConfigurationData assigned;
    assigned.add("old", zrjsonconfig::newObject(), zrjsonconfig::newObject());
    assigned = data;
    for (ConfigurationData* other : {&copy, &assigned}) {
        ASSERT_NE(other->find("t"), nullptr);
        EXPECT_NE(other->find("t"), entry);
        EXPECT_EQ(other->find("old"), nullptr);
        cJSON_AddBoolToObject(other->find("t")->configured(), "simulated", true);
        cJSON_AddBoolToObject(other->find("t")->provided(), "is_present", true);
        other->add("u", zrjsonconfig::newObject(), zrjsonconfig::newObject());
    }
    EXPECT_EQ(printed(data.configuredJson().get()),
              R"({"version":1,"oldest_compatible_version":1,"devices":{"t":{"alias":"Dev1","serial_number":"1A2B"}}})");
    EXPECT_EQ(printed(data.providedJson().get()), R"({"t":{}})");
    EXPECT_EQ(printed(copy.find("t")->configured()), R"({"alias":"Dev1","serial_number":"1A2B","simulated":true})");
    EXPECT_EQ(tokensInFileOrder(copy), (std::vector<std::string>{"t", "u"}));
}

TEST(ConfigurationData, AliasesInUseFollowAddAndRemoveIgnoringCase) {
    ConfigurationData data;
    data.add("a", parsed(R"({"ALIAS":"PXI1Slot2"})"), zrjsonconfig::newObject());  // the name in any ASCII case
    data.add("b", parsed(R"({"alias":"Horloge\u00c9"})"), zrjsonconfig::newObject());
    data.add("c", parsed(R"({"alias":"horlogeé"})"), zrjsonconfig::newObject());  // the same alias, twice
    data.add("d", parsed(R"({"alias":5,"aliases":"Sync1"})"), zrjsonconfig::newObject());
    data.add("e", parsed(R"({"alias":null})"), zrjsonconfig::newObject());
    const zrjsonconfig::AliasesInUse& aliases = data.aliasesInUse();
    EXPECT_EQ(aliases.size(), 3u);
    EXPECT_TRUE(aliases.contains("pxi1slot2"));
    EXPECT_TRUE(aliases.contains("HORLOGEÉ"));
    EXPECT_FALSE(aliases.contains("Sync1"));
    EXPECT_FALSE(aliases.contains("5"));

    data.remove("b");
    EXPECT_TRUE(data.aliasesInUse().contains("horlogeé")) << "the other device still uses it";
    const ConfigurationData copy = data;
    data.remove("c");
    data.remove("a");
    EXPECT_FALSE(data.aliasesInUse().contains("Horlogeé"));
    EXPECT_FALSE(data.aliasesInUse().contains("PXI1Slot2"));
    EXPECT_TRUE(copy.aliasesInUse().contains("Horlogeé") && copy.aliasesInUse().contains("PXI1Slot2"));

    // Malformed UTF-8 equals only the same bytes.
    const zrjsonconfig::AliasesInUse raw{"Dev\xC3", "\xC0\xB1"};
    EXPECT_TRUE(raw.contains("Dev\xC3"));
    EXPECT_FALSE(raw.contains("dev\xC3"));
    EXPECT_FALSE(raw.contains("1")) << "an overlong form is not the character";
}

// Reading the configuration file as the session factory does: open, lock, read, parse.
class ConfigurationFile : public ::testing::Test {
protected:
    LoadedConfiguration load(bool create = false) {
        zrjsonconfig::LockableFile file(zrjsonconfig::configFilePath(), create);
        file.lock();
        LoadedConfiguration loaded = zrjsonconfig::parseConfiguration(file.read(), file.path());
        file.unlock();
        return loaded;
    }
    LoadedConfiguration loadText(const std::string& text) {
        configtest::writeText(_machine.configPath(), text);
        return load();
    }
    Details failureOfText(const std::string& text) {
        configtest::writeText(_machine.configPath(), text);
        return failureOf([&] { load(); });
    }
    std::string path() const { return _machine.configPath(); }

    configtest::Sysroot _machine;
};

TEST_F(ConfigurationFile, MissingAndEmptyFilesAreFreshConfigurations) {
    LoadedConfiguration created = load(true);  // creates the folders and the file
    EXPECT_EQ(configtest::readText(path()), "");
    EXPECT_EQ(created.snapshot, nullptr);
    EXPECT_EQ(printed(created.data.configuredJson().get()), R"({"version":1,"oldest_compatible_version":1,"devices":{}})");

    const LoadedConfiguration empty = loadText("");
    EXPECT_EQ(empty.snapshot, nullptr);
    EXPECT_TRUE(empty.data.entries().empty());
}

TEST_F(ConfigurationFile, TextThatIsNotOneJsonObjectInUtf8FailsAndNamesTheFile) {
    struct Case {
        std::string text;
        std::int32_t code;
        const char* constant;
        const char* comment;
    };
    const char* const kEscapedNul = "A string holds the escape \\u0000 (NUL), which would end it there";
    const std::vector<Case> cases = {
        {" \n\t", -52005, "jsonErrorsInvalidJSON", "The file is not JSON"},
        {"tiktal", -52005, "jsonErrorsInvalidJSON", "The file is not JSON"},
        {R"({"version":1,"devices":{})", -52005, "jsonErrorsInvalidJSON", "The file is not JSON"},
        {R"({"version":1} {"version":1})", -52005, "jsonErrorsInvalidJSON", "The file holds more after its JSON value"},
        {std::string(R"({"version":1})") + '\0', -52005, "jsonErrorsInvalidJSON", "The file holds a NUL byte"},
        {std::string(R"({"version":1,"devices":{"a)") + '\0' + R"(b":{}}})", -52005, "jsonErrorsInvalidJSON",
         "The file holds a NUL byte"},
        {"{\"version\":1,\"devices\":{\"\xff\":{}}}", -52005, "jsonErrorsInvalidJSON", "The file is not valid UTF-8"},
        {"{\"version\":1,\"devices\":{\"\xed\xa0\x80\":{}}}", -52005, "jsonErrorsInvalidJSON", "The file is not valid UTF-8"},
        {R"({"version":1,"devices":{"t":{"pxi_slot_number":1e400}}})", -52005, "jsonErrorsInvalidJSON",
         "A number is beyond the range of a double"},
        {R"({"version":1,"devices":{"X\u0000Y":{}}})", -52005, "jsonErrorsInvalidJSON", kEscapedNul},
        {R"({"version":1,"devices":{"t":{"alias":"Dev\\\u0000One"}}})", -52005, "jsonErrorsInvalidJSON", kEscapedNul},
        {"[1]", -52004, "jsonErrorsNotAnObject", "The file is not a JSON object"},
        {"\"version\"", -52004, "jsonErrorsNotAnObject", "The file is not a JSON object"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.text);
        const Details details = failureOfText(c.text);
        EXPECT_EQ(details.code, c.code);
        EXPECT_EQ(details.constant, c.constant);
        EXPECT_EQ(details.records, (std::vector<std::string>{"kUsageTypeFilePath=" + path(), std::string("# ") + c.comment}));
        EXPECT_EQ(configtest::readText(path()), c.text);  // a failed load leaves the file alone
    }
    // White space around the object is fine, and so is a backslash followed by "u0000".
    EXPECT_NE(loadText(" \r\n{\"version\":1}\n\t ").snapshot, nullptr);
    EXPECT_EQ(tokensInFileOrder(loadText(R"({"version":1,"devices":{"C:\\u0000":{}}})").data),
              std::vector<std::string>{"C:\\u0000"});
}

TEST_F(ConfigurationFile, VersionRules) {
    struct Case {
        const char* text;
        std::int32_t code;  // 0: loads
        const char* constant;
        std::vector<std::string> records;  // without the file path, which comes last
    };
    const std::vector<std::string> tooNew2 = {"kUsageTypeFileVersion=2", "kUsageTypeSupportedVersion=1",
                                              "kUsageTypeOldestCompatibleVersion=1"};
    const std::vector<Case> cases = {
        {R"({"version":1})", 0, "", {}},
        {R"({"version":1,"oldest_compatible_version":1})", 0, "", {}},
        {R"({"version":1,"oldest_compatible_version":0})", 0, "", {}},
        {R"({"version":2,"oldest_compatible_version":1})", 0, "", {}},
        {R"({"version":7,"oldest_compatible_version":1.0})", 0, "", {}},
        {R"({"version":0})",
         static_cast<std::int32_t>(0xBFFA917E),
         "zrvll::kErrorSoftwareTooNewForFile",
         {"kUsageTypeFileVersion=0", "kUsageTypeSupportedVersion=1", "kUsageTypeOldestCompatibleVersion=1"}},
        {R"({"version":0,"oldest_compatible_version":0})",
         static_cast<std::int32_t>(0xBFFA917E),
         "zrvll::kErrorSoftwareTooNewForFile",
         {"kUsageTypeFileVersion=0", "kUsageTypeSupportedVersion=1", "kUsageTypeOldestCompatibleVersion=1"}},
        {R"({"version":2})", static_cast<std::int32_t>(0xBFFA917D), "zrvll::kErrorFileTooNewForSoftware", tooNew2},
        {R"({"version":2,"oldest_compatible_version":2})", static_cast<std::int32_t>(0xBFFA917D),
         "zrvll::kErrorFileTooNewForSoftware", tooNew2},
        {R"({"version":1,"oldest_compatible_version":2})",
         static_cast<std::int32_t>(0xBFFA917D),
         "zrvll::kErrorFileTooNewForSoftware",
         {"kUsageTypeFileVersion=1", "kUsageTypeSupportedVersion=1", "kUsageTypeOldestCompatibleVersion=1"}},
        {R"({"version":4294967295})",
         static_cast<std::int32_t>(0xBFFA917D),
         "zrvll::kErrorFileTooNewForSoftware",
         {"kUsageTypeFileVersion=4294967295", "kUsageTypeSupportedVersion=1", "kUsageTypeOldestCompatibleVersion=1"}},
        {R"({"devices":{}})", -52006, "jsonErrorsObjectItemNotFound", {"# No member \"version\""}},
        {R"({"version":"1"})", -52004, "jsonErrorsTypeMismatch", {"# \"version\" is not a number"}},
        {R"({"version":null})", -52004, "jsonErrorsTypeMismatch", {"# \"version\" is not a number"}},
        {R"({"version":true})", -52004, "jsonErrorsTypeMismatch", {"# \"version\" is not a number"}},
        {R"({"version":-1})", -52004, "jsonErrorsTypeMismatch", {"# \"version\" is not a whole number from 0 to 4294967295"}},
        {R"({"version":4294967296})", -52004, "jsonErrorsTypeMismatch",
         {"# \"version\" is not a whole number from 0 to 4294967295"}},
        {R"({"version":1.5})", -52004, "jsonErrorsTypeMismatch", {"# \"version\" is not a whole number from 0 to 4294967295"}},
        {R"({"version":1,"oldest_compatible_version":"1"})", -52004, "jsonErrorsTypeMismatch",
         {"# \"oldest_compatible_version\" is not a number"}},
        {R"({"version":1,"oldest_compatible_version":-0.5})", -52004, "jsonErrorsTypeMismatch",
         {"# \"oldest_compatible_version\" is not a whole number from 0 to 4294967295"}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.text);
        configtest::writeText(path(), c.text);
        if (c.code == 0) {
            const LoadedConfiguration loaded = load();
            ASSERT_NE(loaded.snapshot, nullptr);
            EXPECT_TRUE(cJSON_Compare(loaded.snapshot.get(), parsed(c.text).get(), true));
            // Whatever the file's versions, the data is written back as version 1.
            EXPECT_EQ(printed(loaded.data.configuredJson().get()),
                      R"({"version":1,"oldest_compatible_version":1,"devices":{}})");
            continue;
        }
        const Details details = failureOf([&] { load(); });
        EXPECT_EQ(details.code, c.code);
        EXPECT_EQ(details.constant, c.constant);
        std::vector<std::string> records = c.records;
        // A comment explains the JSON failures; the file path comes first there, last after the
        // version records.
        if (!records.empty() && records[0][0] == '#')
            records.insert(records.begin(), "kUsageTypeFilePath=" + path());
        else
            records.push_back("kUsageTypeFilePath=" + path());
        EXPECT_EQ(details.records, records);
    }
}

TEST_F(ConfigurationFile, DevicesKeepTheirMembersAndTheFileOrder) {
    const LoadedConfiguration loaded = loadText(R"({
        "version": 2, "oldest_compatible_version": 1, "comment": "dropped when written",
        "devices": {
            "PCI\\VEN_1093&DEV_7405\\B": {"alias": "Dev2", "serial_number": "", "custom": [1, {"x": null}]},
            "PCI\\VEN_1093&DEV_7405\\A": {"alias": "Dev1", "simulated": true, "pxi_slot_number": -1},
            "pci\\ven_1093&dev_7405\\a": {}
        }})");
    EXPECT_EQ(tokensInFileOrder(loaded.data),
              (std::vector<std::string>{"PCI\\VEN_1093&DEV_7405\\B", "PCI\\VEN_1093&DEV_7405\\A", "pci\\ven_1093&dev_7405\\a"}));
    EXPECT_EQ(printed(loaded.data.configuredJson().get()),
              R"({"version":1,"oldest_compatible_version":1,"devices":{)"
              R"("PCI\\VEN_1093&DEV_7405\\B":{"alias":"Dev2","serial_number":"","custom":[1,{"x":null}]},)"
              R"("PCI\\VEN_1093&DEV_7405\\A":{"alias":"Dev1","simulated":true,"pxi_slot_number":-1},)"
              R"("pci\\ven_1093&dev_7405\\a":{}}})");
    EXPECT_EQ(printed(loaded.data.providedJson().get()),
              R"({"PCI\\VEN_1093&DEV_7405\\B":{},"PCI\\VEN_1093&DEV_7405\\A":{},"pci\\ven_1093&dev_7405\\a":{}})");
    // The snapshot is the file as read, extra members and all: the changed test compares with it.
    EXPECT_NE(cJSON_GetObjectItem(loaded.snapshot.get(), "comment"), nullptr);
}

TEST_F(ConfigurationFile, DevicesOfTheWrongTypeOrNamedTwiceFail) {
    struct Case {
        const char* text;
        std::int32_t code;
        const char* constant;
        std::vector<std::string> records;
    };
    const std::string file = "kUsageTypeFilePath=" + path();
    const std::vector<Case> cases = {
        {R"({"version":1,"devices":[]})", -52004, "jsonErrorsNotAnObject", {file, "# \"devices\" is not an object"}},
        {R"({"version":1,"devices":null})", -52004, "jsonErrorsNotAnObject", {file, "# \"devices\" is not an object"}},
        {R"({"version":1,"devices":"Dev1"})", -52004, "jsonErrorsNotAnObject", {file, "# \"devices\" is not an object"}},
        {R"({"version":1,"devices":{"a":{},"b":5}})", -52004, "jsonErrorsNotAnObject",
         {"kUsageTypeToken=b", file, "# A device is not an object"}},
        {R"({"version":1,"devices":{"a":{},"b":{},"a":{"alias":"Dev1"}}})", -52013, "zrapalerr_objectNameCollision",
         {"kUsageTypeToken=a", file}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.text);
        const Details details = failureOfText(c.text);
        EXPECT_EQ(details.code, c.code);
        EXPECT_EQ(details.constant, c.constant);
        EXPECT_EQ(details.records, c.records);
    }
}

}  // namespace
