// The one plug-in object that OpenMI hands out, called from many threads at
// once: every call is serialised on the object, so no call crashes, and
// every initialize leaves the whole tree, never a part of it.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <atomic>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "PluginLoader.h"
#include "QNLog/QNLogger.h"
#include "TestSupport.h"

namespace {

using plugintest::LoadedPlugin;

unsigned int const kMiId = 1;

// The tree as text: every node's ids, type, index, status, description and
// properties (the computer system's clock properties 126 and 127 left out:
// they are read afresh each time).
std::string treeText(IC::ManagementInterface& mi) {
    std::vector<IC::Node*> nodes;
    mi.getMap(nodes);
    std::ostringstream text;
    for (IC::Node const* node : nodes) {
        auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
        text << node->getNodeId() << " <- " << node->getLinkedId() << " type "
             << (mutableNode != nullptr ? mutableNode->getNodeType() : 0) << " index "
             << node->getIndex() << " status " << node->getStatus() << " \""
             << node->getDescription() << "\"\n";
        for (auto const& property : node->getProperties()) {
            if (property.first != 126 && property.first != 127) {
                text << "  " << property.first << " = " << property.second << "\n";
            }
        }
    }
    return text.str();
}

size_t nodeCount(IC::ManagementInterface& mi) {
    std::vector<IC::Node*> nodes;
    mi.getMap(nodes);
    return nodes.size();
}

bool initializeOnce(IC::ManagementInterface& mi) {
    return mi.initialize(kMiId, IC::Number(0u), IC::Number(0u)).getStatus() == 0;
}

// The demo server's dump as the override file, and a code folder without a
// physical-memory library: every acquisition reads the same file.
class PluginThreads : public ::testing::Test {
protected:
    void SetUp() override {
        std::string const example =
            std::string(std::getenv("SMBIOS_SOURCE_DIR")) + "/examples/demo-server.smbios.txt";
        mkdir((data_.path() + "/SmBiosOverride").c_str(), 0700);
        mkdir((data_.path() + "/SmBiosOverride").c_str(), 0700);
        smbiostest::writeFile(data_.path() + "/SmBiosOverride/smbios.txt",
                              smbiostest::fileText(example));
        ASSERT_TRUE(plugin_.loaded()) << plugin_.error();
        ASSERT_TRUE(initializeOnce(plugin_.mi()));
        reference_ = treeText(plugin_.mi());
        expectedNodes_ = nodeCount(plugin_.mi());
        ASSERT_GT(expectedNodes_, 70u) << reference_;
    }

    smbiostest::TempDir data_;
    smbiostest::TempDir code_;
    smbiostest::ScopedEnv dataDir_{"KESTREL_DATA_DIR", data_.path()};
    smbiostest::ScopedEnv codeDir_{"KESTREL_CODE_DIR", code_.path()};
    LoadedPlugin plugin_;
    std::string reference_;
    size_t expectedNodes_ = 0;
};

TEST_F(PluginThreads, SixteenThreadsOfAHundredInitializesEachLeaveTheWholeTree) {
    std::atomic<unsigned int> failedInitializes{0};
    std::atomic<unsigned int> partialTrees{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < 16; ++t) {
        threads.emplace_back([&] {
            for (int round = 0; round < 100; ++round) {
                if (!initializeOnce(plugin_.mi())) {
                    ++failedInitializes;
                }
                if (nodeCount(plugin_.mi()) != expectedNodes_) {
                    ++partialTrees;
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(failedInitializes.load(), 0u);
    EXPECT_EQ(partialTrees.load(), 0u);
    EXPECT_EQ(treeText(plugin_.mi()), reference_);
}

// Readers of the node list and the other operations, while other threads
// rebuild it: a reader sees the whole tree every time, never a half-made or
// empty one.
TEST_F(PluginThreads, OtherOperationsDuringInitializeSeeOnlyWholeTrees) {
    std::atomic<bool> stop{false};
    std::atomic<unsigned int> partialTrees{0};
    std::atomic<unsigned int> reads{0};
    std::vector<std::thread> readers;
    for (int t = 0; t < 8; ++t) {
        readers.emplace_back([&] {
            IC::ManagementInterface& mi = plugin_.mi();
            while (!stop.load()) {
                if (nodeCount(mi) != expectedNodes_) {
                    ++partialTrees;
                }
                IC::Node* node = nullptr;
                mi.getNode(std::to_string(kMiId), node);
                std::string const summary = static_cast<std::string>(mi);
                if (summary.find("nodes=" + std::to_string(expectedNodes_)) == std::string::npos) {
                    ++partialTrees;
                }
                mi.registerForAlerts(nullptr, nullptr);
                mi.deRegisterForAlerts();
                ++reads;
            }
        });
    }
    std::vector<std::thread> writers;
    for (int t = 0; t < 8; ++t) {
        writers.emplace_back([&] {
            for (int round = 0; round < 50; ++round) {
                initializeOnce(plugin_.mi());
            }
        });
    }
    for (std::thread& thread : writers) {
        thread.join();
    }
    stop = true;
    for (std::thread& thread : readers) {
        thread.join();
    }
    EXPECT_GT(reads.load(), 0u);
    EXPECT_EQ(partialTrees.load(), 0u);
    EXPECT_EQ(treeText(plugin_.mi()), reference_);
}

// The same with every message of every level written, so that the logger
// is exercised from many threads too.
TEST_F(PluginThreads, ConcurrentInitializesWithEveryLevelLogged) {
    smbiostest::TempDir logs;
    ASSERT_TRUE(QNLog::QNLogger::setLogFile(logs.file("plugin.log")));
    int const logLevel = QNLog::QNLogger::getLogLevel();
    int const traceLevel = QNLog::QNLogger::getTraceLevel();
    QNLog::QNLogger::setLogLevel(0);
    QNLog::QNLogger::setTraceLevel(0);
    std::atomic<unsigned int> partialTrees{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int round = 0; round < 10; ++round) {
                initializeOnce(plugin_.mi());
                if (nodeCount(plugin_.mi()) != expectedNodes_) {
                    ++partialTrees;
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    QNLog::QNLogger::setLogLevel(logLevel);
    QNLog::QNLogger::setTraceLevel(traceLevel);
    QNLog::QNLogger::setLogFile("");
    EXPECT_EQ(partialTrees.load(), 0u);
    EXPECT_EQ(treeText(plugin_.mi()), reference_);
    EXPECT_GT(smbiostest::fileText(logs.file("plugin.log")).size(), 0u);
}

}  // namespace
