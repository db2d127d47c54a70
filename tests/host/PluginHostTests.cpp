// The host's plug-in loader, in this process: the real SMBIOS plug-in on the
// example server, whose sensor and BMC builders the host calls itself after
// initialize, and plug-ins that are not the one the host is linked with.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "TestSupport.h"
#include "inventory/PluginHost.h"

namespace {

unsigned int const kPlanarType = 41;
unsigned int const kBmcType = 13;
unsigned int const kVoltageType = 21;
unsigned int const kTemperatureType = 22;

std::string realPlugin() { return hosttest::outDir() + "/libsmbiosmi.so"; }
std::string fakePlugin() { return hosttest::outDir() + "/" + HOST_FAKE_PLUGIN_FROM_OUT; }

unsigned int typeOf(IC::Node const* node) {
    auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
    return mutableNode != nullptr ? mutableNode->getNodeType() : 0;
}

class PluginHostTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        // The example server as the override file of a private data folder.
        std::filesystem::create_directory(data_.file("SmBiosOverride"));
        smbiostest::writeFile(
            data_.file("SmBiosOverride/smbios.txt"),
            smbiostest::fileText(hosttest::sourceDir() + "/examples/demo-server.smbios.txt"));
    }

    // The nodes of the host after initialize; fails the test on any error.
    std::vector<IC::Node*> initialized(inventory::PluginHost& host) {
        std::string why;
        EXPECT_TRUE(host.load(why)) << why;
        EXPECT_TRUE(host.initialize(why)) << why;
        return nodes(host);
    }

    static std::vector<IC::Node*> nodes(inventory::PluginHost& host) {
        std::vector<IC::Node*> list;
        std::string why;
        EXPECT_TRUE(host.getNodes(list, why)) << why;
        return list;
    }

    smbiostest::TempDir data_;
    smbiostest::ScopedEnv dataDir_{"KESTREL_DATA_DIR", data_.path() + "/"};
};

TEST_F(PluginHostTest, TheRealPluginIsTheLinkedOne) {
    inventory::PluginHost host(realPlugin());
    std::string why;
    ASSERT_TRUE(host.load(why)) << why;
    EXPECT_TRUE(host.isLinkedSmBiosPlugin());
}

TEST_F(PluginHostTest, TheFakePluginIsNotTheLinkedOne) {
    inventory::PluginHost host(fakePlugin());
    std::string why;
    ASSERT_TRUE(host.load(why)) << why;
    EXPECT_FALSE(host.isLinkedSmBiosPlugin());
}

TEST_F(PluginHostTest, ACopyOfTheRealPluginIsNotTheLinkedOne) {
    // Another file holds another copy of the plug-in's table and nodes: the
    // host's calls would reach the linked copy, not this one.
    smbiostest::TempDir folder;
    std::string const copy = folder.file("libsmbiosmi.so");
    std::filesystem::copy_file(realPlugin(), copy);
    inventory::PluginHost host(copy);
    std::string why;
    ASSERT_TRUE(host.load(why)) << why;
    EXPECT_FALSE(host.isLinkedSmBiosPlugin());
}

TEST_F(PluginHostTest, MissingPluginSaysWhy) {
    smbiostest::TempDir folder;
    inventory::PluginHost host(folder.file("libnothing.so"));
    std::string why;
    EXPECT_FALSE(host.load(why));
    EXPECT_NE(why.find("cannot load the plug-in " + folder.file("libnothing.so")),
              std::string::npos)
        << why;
    EXPECT_FALSE(host.isLinkedSmBiosPlugin());
}

TEST_F(PluginHostTest, SensorNodesThenBmcNodesFollowTheOthersUnderThePlanar) {
    inventory::PluginHost host(realPlugin());
    std::vector<IC::Node*> const before = initialized(host);
    ASSERT_FALSE(before.empty());
    unsigned int planar = 0;
    for (IC::Node const* node : before) {
        if (planar == 0 && typeOf(node) == kPlanarType) {
            planar = node->getNodeId();
        }
    }
    ASSERT_NE(planar, 0u) << "no planar node";

    inventory::ExtraNodes extra;
    extra.locations = {3, 4};
    extra.bmc = true;
    std::string why;
    ASSERT_TRUE(host.makeExtraNodes(extra, why)) << why;
    std::vector<IC::Node*> const after = nodes(host);
    ASSERT_GT(after.size(), before.size() + 5);
    // Processor: two temperature sensors, one voltage sensor; disk: one
    // voltage sensor; then the BMC, all under the planar.
    unsigned int const expected[] = {kTemperatureType, kTemperatureType, kVoltageType, kVoltageType,
                                     kBmcType};
    for (size_t i = 0; i < 5; ++i) {
        SCOPED_TRACE("new node " + std::to_string(i));
        IC::Node const* node = after[before.size() + i];
        EXPECT_EQ(typeOf(node), expected[i]);
        EXPECT_EQ(node->getLinkedId(), planar);
        EXPECT_EQ(node->getNodeId(), before.back()->getNodeId() + 1 + i);
    }
    // Everything after the BMC hangs under it or under its nodes.
    unsigned int const bmc = after[before.size() + 4]->getNodeId();
    for (size_t i = before.size() + 5; i < after.size(); ++i) {
        EXPECT_GT(after[i]->getLinkedId(), bmc - 1) << "node " << after[i]->getNodeId();
    }
}

TEST_F(PluginHostTest, NoLocationsAndNoBmcMakeNoNode) {
    inventory::PluginHost host(realPlugin());
    std::vector<IC::Node*> const before = initialized(host);
    std::string why;
    ASSERT_TRUE(host.makeExtraNodes(inventory::ExtraNodes(), why)) << why;
    EXPECT_EQ(nodes(host).size(), before.size());
}

}  // namespace
