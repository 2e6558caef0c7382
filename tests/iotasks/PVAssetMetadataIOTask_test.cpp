#include "parvel/iotasks/PVAssetMetadataIOTask.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "tests/support/ManagedFolder.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

class IOTaskBase : public ManagedFolder {
protected:
    AssetPtr m_asset = asset("a.pdf");
    std::shared_ptr<PVAssetMetadataIOTask> m_task =
        PVAssetMetadataIOTask::initWithSourceMetadata_manager(m_asset, m_manager);
};

TEST_F(IOTaskBase, KeepsItsRecordAndItsManager) {
    EXPECT_EQ(m_task->sourceMetadata(), m_asset);
    EXPECT_EQ(m_task->manager(), m_manager);
    EXPECT_FALSE(m_task->progressHandler());
}

TEST_F(IOTaskBase, KeepsItsManagerAlive) {
    const std::weak_ptr<PVAssetMetadataFileManager> manager = m_manager;
    m_manager.reset();

    EXPECT_FALSE(manager.expired());
}

TEST_F(IOTaskBase, KeepsACopyOfItsProgressHandler) {
    int calls = 0;
    {
        const PVAssetMetadataIOTask::ProgressHandler handler = [&](const AssetPtr&) { ++calls; };
        m_task->setProgressHandler(handler);
    }

    m_task->progressHandler()(m_asset);

    EXPECT_EQ(calls, 1);
}

TEST_F(IOTaskBase, ExecutingItIsAnInvalidArgument) {
    try {
        (void)m_task->executeWithTargetDirectory_error(m_folder.url("target"), &m_error);
        FAIL() << "nothing was thrown";
    } catch (const std::invalid_argument& exception) {
        EXPECT_STREQ(exception.what(), "This is an abstract class method");
    }
    EXPECT_FALSE(m_error);
}

TEST_F(IOTaskBase, CancellingItDoesNothing) {
    RecordedLog log;

    m_task->cancel();

    EXPECT_TRUE(log.lines().empty());
    EXPECT_EQ(names(), Names{"a.pdf"});
}

}  // namespace
}  // namespace parvel::testing
