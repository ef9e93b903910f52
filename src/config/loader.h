// Reading the configuration file's text: the JSON, the version rules and the file's devices.
#pragma once

#include <string>

#include "config/attribute_provider.h"
#include "config/configuration_data.h"
#include "config/device_iterator.h"
#include "config/json_tree.h"

namespace zrjsonconfig {

// What one reading of the file gives: the data with the file's devices, in file order, each with
// a copy of its configured attributes and the provided attributes of a device not discovered;
// and the file's JSON as read (null for an empty file), against which a later save tells whether
// anything changed. Merging the devices that discovery finds comes after this, on `data`.
struct LoadedConfiguration {
    ConfigurationData data;
    JsonTree snapshot;
};

// Parses the text of the configuration file at `path`; every failure names the path in its
// details. The rules:
// - an empty text is a fresh configuration (version 1, no devices);
// - otherwise the text must be one JSON object in UTF-8, with nothing but white space after it,
//   no NUL byte and no number beyond the range of a double (it could not be written back):
//   jsonErrorsInvalidJSON (-52005), or jsonErrorsNotAnObject (-52004) for another value;
// - "version" must be there (jsonErrorsObjectItemNotFound, -52006), and it and
//   "oldest_compatible_version" (which defaults to "version") must be whole numbers from 0 to
//   4294967295 (jsonErrorsTypeMismatch, -52004);
// - a version below 1 fails with kErrorSoftwareTooNewForFile (0xBFFA917E), an oldest compatible
//   version above 1 with kErrorFileTooNewForSoftware (0xBFFA917D);
// - "devices" may be missing (no devices); otherwise it and each of its members must be objects
//   (jsonErrorsNotAnObject), and no token may come twice (-52013).
// Other top-level members are not kept; other members of a device's object are. `provider`, when
// given, fills each device's attributes as a device not discovered (its failures pass through);
// without it the provided objects stay empty.
LoadedConfiguration parseConfiguration(const std::string& text, const std::string& path,
                                       AttributeProviderInterface* provider = nullptr);

// Merges the devices that discovery finds, in its order, into `data`: a device that `data` holds
// keeps a copy of its configured attributes and moves to the end; each gets its attributes from
// `provider`. A token that discovery yields twice fails with -52013 (two devices would become
// one).
void mergeDiscovered(ConfigurationData& data, DeviceIteratorInterface& devices, AttributeProviderInterface& provider);

}  // namespace zrjsonconfig
