// A management-interface plug-in for the host tests. It exports OpenMI as the
// real plug-in does and, on initialize, builds a small inventory whose every
// value the tests know: one property of every kind, a node with a path and a
// parent, a node that computes a value when it is read, a node that is not a
// MutableNode, and facts about the run (data and code directories, the first
// line of the override file, the plug-in's own file).
//
// The environment steers it:
//   FAKE_MI_FAIL=1      initialize returns status 3 with a message
//   FAKE_MI_OPEN=fail   OpenMI returns 5
//   FAKE_MI_OPEN=null   OpenMI returns 0 but hands out no interface
//   FAKE_MI_CYCLE=1     two more nodes whose linked ids point at each other
//   FAKE_MI_SLEEP=1     initialize waits 60 s first, for the host's signal tests

#include <dlfcn.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "FakePluginIds.h"
#include "IC/EnumValue.h"
#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "IC/PropertyMap.h"
#include "IC/PropertyValue.h"
#include "IC/Version2.h"
#include "QNLog/QNLogger.h"
#include "QNLog/QNMessageBuffer.h"
#include "SD/PlatformUtilities.h"

namespace {

using namespace fakeplugin;

bool envIs(char const* name, char const* value) {
    char const* actual = std::getenv(name);
    return actual != nullptr && std::strcmp(actual, value) == 0;
}

// A core whose value kComputedProperty is made when it is read; the stored
// value under that id is never what a reader should see.
class ComputedNode : public IC::MutableNode {
public:
    ComputedNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds)
        : IC::MutableNode(nodeId, linkedId, std::move(miIds), 42, 0) {}

    IC::Error getProperty(unsigned int id, IC::PropertyValue& value) const override {
        if (id == kComputedProperty) {
            value = IC::PropertyValue(std::string(kComputedValue), false);
            return IC::Error();
        }
        return IC::MutableNode::getProperty(id, value);
    }
};

// A node that is not one of the framework's ordinary nodes: it has no type,
// path or parent to show.
class PlainNode : public IC::Node {
public:
    PlainNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds)
        : nodeId_(nodeId), linkedId_(linkedId), miIds_(std::move(miIds)) {
        properties_[1] = IC::PropertyValue(std::string("plain"), false);
    }

    unsigned int getStatus() const override { return 2; }
    std::string getDescription() const override { return kPlainDescription; }
    IC::Error getProperty(unsigned int id, IC::PropertyValue& value) const override {
        auto found = properties_.find(id);
        if (found == properties_.end()) {
            return IC::Error(1, IC::Number(0u), "no such property");
        }
        value = found->second;
        return IC::Error();
    }
    IC::PropertyMap const& getProperties() const override { return properties_; }
    IC::Error setProperty(unsigned int const& id, IC::PropertyValue const& value) override {
        properties_[id] = value;
        return IC::Error();
    }
    unsigned int getNodeId() const override { return nodeId_; }
    unsigned int getLinkedId() const override { return linkedId_; }
    unsigned int getIndex() const override { return 5; }
    std::vector<unsigned int> const& getMIIds() const override { return miIds_; }
    IC::Error addMI(unsigned int miId) override {
        miIds_.push_back(miId);
        return IC::Error();
    }
    IC::Error delMI(unsigned int) override { return IC::Error(); }

private:
    unsigned int nodeId_;
    unsigned int linkedId_;
    std::vector<unsigned int> miIds_;
    IC::PropertyMap properties_;
};

// The file this plug-in was loaded from.
std::string ownFile() {
    static int const anchor = 0;
    Dl_info info;
    if (dladdr(&anchor, &info) == 0 || info.dli_fname == nullptr) {
        return std::string();
    }
    return info.dli_fname;
}

// The first line of a file and its size in bytes; found is false when the
// file cannot be read.
std::string firstLineOf(std::string const& path, bool& found, unsigned int& size) {
    std::ifstream in(path, std::ios::binary);
    std::string line;
    found = static_cast<bool>(in) && static_cast<bool>(std::getline(in, line));
    size = 0;
    if (found) {
        in.clear();
        in.seekg(0, std::ios::end);
        size = static_cast<unsigned int>(in.tellg());
    }
    return line;
}

class FakeMI : public IC::ManagementInterface {
public:
    IC::Error initialize(unsigned int id, IC::Number const& a, IC::Number const& b) override {
        IC::Error base = IC::ManagementInterface::initialize(id, a, b);
        if (base.getStatus() != 0) {
            return base;
        }
        // Output that the host must keep off its standard output, through
        // both the C and the C++ stream.
        std::printf("%s\n", kStdoutLine);
        std::cout << kStdoutLineCpp << std::endl;

        QNLog::QNLogger const logger("FakeMI");
        QNLog::QNMessageBuffer logText;
        logText << kLogText;
        QNLog::QNLogger::logLevelMessage(__func__, __FILE__, __LINE__, logger, 5000, logText);
        QNLog::QNMessageBuffer traceText;
        traceText << kTraceText;
        QNLog::QNLogger::traceLevelMessage(__func__, __FILE__, __LINE__, logger, 5000, traceText);

        if (envIs("FAKE_MI_SLEEP", "1")) {
            for (int tenth = 0; tenth < 600; ++tenth) {
                usleep(100000);
            }
        }
        if (envIs("FAKE_MI_FAIL", "1")) {
            return IC::Error(3, IC::Number(7u), kFailMessage);
        }
        build();
        return IC::Error();
    }

private:
    IC::MutableNode* add(IC::MutableNode* node) {
        IC::Node* added = node;
        addNewNode(added);
        return node;
    }

    void build() {
        std::vector<unsigned int> const ids = miIdList;

        IC::MutableNode* mi = add(new IC::MutableNode(kMiNode, 0, ids, 15, 0));
        mi->setDescription(kMiDescription);
        mi->setStatus(1);

        IC::MutableNode* root = add(new IC::MutableNode(kRootNode, kMiNode, ids, 59, 0));
        root->setDescription(kRootDescription);
        root->setStatus(1);
        std::string const dataDir = SD::PlatformUtilities::getKestrelDataDir();
        root->setProperty(kDataDirProperty, IC::PropertyValue(dataDir, false));
        root->setProperty(kCodeDirProperty,
                          IC::PropertyValue(SD::PlatformUtilities::getKestrelCodeDir(), false));
        root->setProperty(kPluginFileProperty, IC::PropertyValue(ownFile(), false));
        bool found = false;
        unsigned int size = 0;
        std::string const first = firstLineOf(dataDir + "SmBiosOverride/smbios.txt", found, size);
        if (found) {
            root->setProperty(kOverrideLineProperty, IC::PropertyValue(first, false));
            root->setProperty(kOverrideSizeProperty, IC::PropertyValue(IC::Number(size), false));
        }

        IC::MutableNode* kinds = add(new IC::MutableNode(kKindsNode, kRootNode, ids, 40, 0));
        kinds->setDescription(kKindsDescription);
        kinds->setStatus(1);
        kinds->setProperty(kStringProperty, IC::PropertyValue(std::string(kLatin1Text), false));
        kinds->setProperty(kBoolProperty, IC::PropertyValue(IC::Number(true), false));
        kinds->setProperty(kUnsignedProperty, IC::PropertyValue(IC::Number(kUnsignedValue), false));
        kinds->setProperty(kDoubleProperty, IC::PropertyValue(IC::Number(kDoubleValue), false));
        kinds->setProperty(kVersionProperty,
                           IC::PropertyValue(IC::Number(IC::Version2(3, 14)), false));
        kinds->setProperty(kDateTimeProperty,
                           IC::PropertyValue(IC::Number(IC::Number::DATETIME), false));
        kinds->setProperty(kNoneNumberProperty, IC::PropertyValue(IC::Number(), false));
        kinds->setProperty(kNoneProperty, IC::PropertyValue());
        kinds->setProperty(
            kEnum8Property,
            IC::PropertyValue(IC::EnumValue(static_cast<unsigned char>(200)), false));
        kinds->setProperty(
            kEnum16Property,
            IC::PropertyValue(IC::EnumValue(static_cast<unsigned short>(60000)), false));
        kinds->setProperty(kEnum32Property, IC::PropertyValue(IC::EnumValue(70000u), false));
        kinds->setProperty(kByteProperty,
                           IC::PropertyValue(static_cast<unsigned char>(0xAB), false));
        kinds->setProperty(
            kBytesProperty,
            IC::PropertyValue(std::vector<unsigned char>{0x00, 0x1F, 0xAB, 0xFF}, false));
        kinds->setProperty(
            kNumbersProperty,
            IC::PropertyValue(
                std::vector<IC::Number>{IC::Number(1u), IC::Number(true), IC::Number(2.5),
                                        IC::Number(IC::Version2(1, 2)), IC::Number()},
                false));
        kinds->setProperty(
            kStringsProperty,
            IC::PropertyValue(std::vector<std::string>{"alpha", kLatin1Text, ""}, false));
        kinds->setProperty(kKindProperty, IC::PropertyValue(IC::PropertyValue::STRINGS, false));

        IC::MutableNode* cpu = add(new IC::MutableNode(kCpuNode, kRootNode, ids, 4, 1));
        cpu->setDescription(kCpuDescription);
        cpu->setStatus(1);
        cpu->setPath(kCpuPath);
        cpu->setParent(kCpuParent);

        IC::MutableNode* core = add(new ComputedNode(kCoreNode, kCpuNode, ids));
        core->setDescription(kCoreDescription);
        core->setStatus(1);
        core->setProperty(kComputedProperty, IC::PropertyValue(std::string("stored"), false));

        IC::Node* plain = new PlainNode(kPlainNode, kMissingNode, ids);
        addNewNode(plain);

        if (envIs("FAKE_MI_CYCLE", "1")) {
            IC::MutableNode* first = add(new IC::MutableNode(kCycleNodeA, kCycleNodeB, ids, 62, 0));
            first->setDescription(kCycleDescriptionA);
            IC::MutableNode* second =
                add(new IC::MutableNode(kCycleNodeB, kCycleNodeA, ids, 70, 0));
            second->setDescription(kCycleDescriptionB);
        }
    }
};

}  // namespace

extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi,
                                                             IC::Error** err) {
    std::printf("%s\n", kOpenStdoutLine);
    static IC::Error openError;
    if (err != nullptr) {
        *err = &openError;
    }
    if (envIs("FAKE_MI_OPEN", "fail")) {
        openError = IC::Error(5, IC::Number(0u), kOpenFailMessage);
        return 5;
    }
    if (envIs("FAKE_MI_OPEN", "null")) {
        *mi = nullptr;
        return 0;
    }
    static FakeMI instance;
    *mi = &instance;
    return 0;
}
