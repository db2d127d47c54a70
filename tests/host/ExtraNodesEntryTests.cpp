// The plug-in's optional entry point SmBiosMIExtraNodes, called in this
// process the way smbios-inventory calls it: after OpenMI and initialize
// on the example server, with the parent node's id, the probe locations and
// whether to make the BMC nodes.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "TestSupport.h"

namespace {

typedef int (*ExtraNodesFunction)(unsigned int parentId, unsigned int const* locations,
                                  unsigned int locationCount, int bmc);

unsigned int const kPlanarType = 41;
unsigned int const kBmcType = 13;
unsigned int const kVoltageType = 21;
unsigned int const kTemperatureType = 22;

// Looks a function up in the plug-in.
template <typename Function>
Function entryPoint(void* library, char const* name) {
    void* symbol = dlsym(library, name);
    Function function = nullptr;
    static_assert(sizeof function == sizeof symbol, "function and data pointers differ in size");
    if (symbol != nullptr) {
        std::memcpy(&function, &symbol, sizeof function);
    }
    return function;
}

class ExtraNodesEntry : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        // The example server as the override file of a private data folder.
        std::filesystem::create_directory(data_.file("SmBiosOverride"));
        smbiostest::writeFile(
            data_.file("SmBiosOverride/smbios.txt"),
            smbiostest::fileText(hosttest::sourceDir() + "/examples/demo-server.smbios.txt"));

        std::string const plugin = hosttest::outDir() + "/libsmbiosmi.so";
        // The plug-in stays loaded until the process ends, as under the
        // agent: its nodes live in it.
        library_ = dlopen(plugin.c_str(), RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(library_, nullptr) << dlerror();
        auto openMI = entryPoint<IC::OpenMIFunction>(library_, "OpenMI");
        extraNodes_ = entryPoint<ExtraNodesFunction>(library_, "SmBiosMIExtraNodes");
        ASSERT_NE(openMI, nullptr);
        ASSERT_NE(extraNodes_, nullptr);
        IC::Error* error = nullptr;
        ASSERT_EQ(openMI(&mi_, &error), 0);
        ASSERT_NE(mi_, nullptr);
        ASSERT_EQ(mi_->initialize(1, IC::Number(0u), IC::Number(0u)).getStatus(), 0);
        before_ = nodes();
        ASSERT_FALSE(before_.empty());
    }

    std::vector<IC::Node*> nodes() {
        std::vector<IC::Node*> list;
        EXPECT_EQ(mi_->getMap(list).getStatus(), 0);
        return list;
    }

    static unsigned int typeOf(IC::Node const* node) {
        auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
        return mutableNode != nullptr ? mutableNode->getNodeType() : 0;
    }

    unsigned int planarId() {
        for (IC::Node const* node : before_) {
            if (typeOf(node) == kPlanarType) {
                return node->getNodeId();
            }
        }
        ADD_FAILURE() << "no planar node";
        return 0;
    }

    smbiostest::TempDir data_;
    smbiostest::ScopedEnv dataDir_{"KESTREL_DATA_DIR", data_.path() + "/"};
    void* library_ = nullptr;
    ExtraNodesFunction extraNodes_ = nullptr;
    IC::ManagementInterface* mi_ = nullptr;
    std::vector<IC::Node*> before_;
};

TEST_F(ExtraNodesEntry, UnknownParentIdReturnsNonZeroAndMakesNoNode) {
    unsigned int unknown = 0;
    for (IC::Node const* node : before_) {
        unknown = std::max(unknown, node->getNodeId() + 1000);
    }
    unsigned int const processor = 3;
    EXPECT_NE(extraNodes_(unknown, &processor, 1, 1), 0);
    EXPECT_EQ(nodes().size(), before_.size());
}

TEST_F(ExtraNodesEntry, PlanarParentGetsSensorNodesThenBmcNodesAfterTheOthers) {
    unsigned int const planar = planarId();
    unsigned int const locations[] = {3, 4};
    ASSERT_EQ(extraNodes_(planar, locations, 2, 1), 0);
    std::vector<IC::Node*> const after = nodes();
    ASSERT_GT(after.size(), before_.size() + 5);
    // Processor: two temperature sensors, one voltage sensor; disk: one
    // voltage sensor; then the BMC, all under the planar.
    unsigned int const expected[] = {kTemperatureType, kTemperatureType, kVoltageType, kVoltageType,
                                     kBmcType};
    for (size_t i = 0; i < 5; ++i) {
        SCOPED_TRACE("new node " + std::to_string(i));
        IC::Node const* node = after[before_.size() + i];
        EXPECT_EQ(typeOf(node), expected[i]);
        EXPECT_EQ(node->getLinkedId(), planar);
        EXPECT_EQ(node->getNodeId(), before_.back()->getNodeId() + 1 + i);
    }
    // Everything after the BMC hangs under it or under its nodes.
    unsigned int const bmc = after[before_.size() + 4]->getNodeId();
    for (size_t i = before_.size() + 5; i < after.size(); ++i) {
        EXPECT_GT(after[i]->getLinkedId(), bmc - 1) << "node " << after[i]->getNodeId();
    }
}

TEST_F(ExtraNodesEntry, NoLocationsAndNoBmcMakeNoNode) {
    EXPECT_EQ(extraNodes_(planarId(), nullptr, 5, 0), 0);
    EXPECT_EQ(nodes().size(), before_.size());
}

}  // namespace
