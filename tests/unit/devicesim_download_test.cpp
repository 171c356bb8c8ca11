// A download acted out step by step on a clock of the test's own: the events, their order,
// the pacing and the faults.
#include <windows.h>
#include <objidl.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "SimDownload.h"
#include "support/DeviceSim.h"

using namespace testsupport;

namespace {

using Step = SimDownload::Step;

struct Outcome {
    std::vector<SimDownload::Event> events;
    std::string written;
    ULONGLONG position = 0;
};

std::string Bytes(size_t size) {
    std::string bytes(size, '\0');
    for (size_t i = 0; i < size; ++i) bytes[i] = static_cast<char>(i * 7 + 3);
    return bytes;
}

// Takes every event due at each instant of the clock, until the finish or the exit.
Outcome Drive(size_t size, const SimTransferPlan& plan, const std::vector<ULONGLONG>& clock) {
    ComPtr<IStream> stream = NewMemoryStream();
    SimDownload download(Bytes(size), stream, plan);
    Outcome run;
    SimDownload::Event event;
    for (ULONGLONG now : clock) {
        while (download.Next(now, &event)) {
            run.events.push_back(event);
            if (event.step == Step::Exit) download.SkipExit();
        }
        if (download.Ended()) break;
    }
    run.written = StreamBytes(stream.Get());
    run.position = StreamPosition(stream.Get());
    return run;
}

std::vector<int> Percents(const Outcome& run) {
    std::vector<int> percents;
    for (const auto& e : run.events)
        if (e.step == Step::Progress) percents.push_back(e.percent);
    return percents;
}

}  // namespace

TEST(DeviceSimDownloadTest, AnUnpacedDownloadBeginsProgressesAndFinishesAtTheStreamStart) {
    Outcome run = Drive(300000, SimTransferPlan(), {0, 0});
    ASSERT_GE(run.events.size(), 3u);
    EXPECT_EQ(Step::Begin, run.events.front().step);
    EXPECT_EQ(Step::Finish, run.events.back().step);
    EXPECT_EQ(S_OK, run.events.back().result);
    // 64 KiB chunks of 300000 bytes: 21, 43, 65, 87, 100 percent.
    EXPECT_EQ((std::vector<int>{21, 43, 65, 87, 100}), Percents(run));
    EXPECT_EQ(Bytes(300000), run.written);
    EXPECT_EQ(0u, run.position);
}

TEST(DeviceSimDownloadTest, AnEmptyFileReportsOneHundredPercentAndFinishes) {
    Outcome run = Drive(0, SimTransferPlan(), {0, 0});
    ASSERT_EQ(3u, run.events.size());
    EXPECT_EQ(Step::Begin, run.events[0].step);
    EXPECT_EQ(Step::Progress, run.events[1].step);
    EXPECT_EQ(100, run.events[1].percent);
    EXPECT_EQ(Step::Finish, run.events[2].step);
    EXPECT_TRUE(run.written.empty());
}

TEST(DeviceSimDownloadTest, TheRateSpreadsTheBytesOverTime) {
    SimTransferPlan plan;
    plan.rate = 1000;  // bytes per second
    ComPtr<IStream> stream = NewMemoryStream();
    SimDownload download(Bytes(2000), stream, plan);
    SimDownload::Event event;
    ASSERT_TRUE(download.Next(5000, &event));
    EXPECT_EQ(Step::Begin, event.step);  // the clock starts at the begin event
    EXPECT_FALSE(download.Next(5000, &event));  // nothing is due yet
    ASSERT_TRUE(download.Next(5500, &event));
    EXPECT_EQ(25, event.percent);  // half a second: 500 of 2000 bytes
    EXPECT_FALSE(download.Next(5500, &event));
    ASSERT_TRUE(download.Next(6500, &event));
    EXPECT_EQ(75, event.percent);
    ASSERT_TRUE(download.Next(7000, &event));
    EXPECT_EQ(100, event.percent);
    ASSERT_TRUE(download.Next(7000, &event));
    EXPECT_EQ(Step::Finish, event.step);
    EXPECT_FALSE(download.Next(9000, &event));
}

TEST(DeviceSimDownloadTest, FaultsStrikeBeforeTheirPercentIsReported) {
    const struct {
        long failAt, exitAt;
        std::vector<Step> steps;
        std::vector<int> percents;
        HRESULT result;
    } cases[] = {
        {40, -1, {Step::Begin, Step::Progress, Step::Finish}, {21}, E_ABORT},
        {0, -1, {Step::Begin, Step::Finish}, {}, E_ABORT},
        {-1, 50, {Step::Begin, Step::Progress, Step::Progress, Step::Exit, Step::Progress, Step::Progress,
                  Step::Progress, Step::Finish}, {21, 43, 65, 87, 100}, S_OK},  // an exit skipped goes on
        {100, -1, {Step::Begin, Step::Progress, Step::Progress, Step::Progress, Step::Progress, Step::Finish},
         {21, 43, 65, 87}, E_ABORT},
    };
    for (const auto& c : cases) {
        SimTransferPlan plan;
        plan.failAtPercent = c.failAt;
        plan.failResult = E_ABORT;
        plan.exitAtPercent = c.exitAt;
        Outcome run = Drive(300000, plan, {0, 0});
        std::vector<Step> steps;
        for (const auto& e : run.events) steps.push_back(e.step);
        EXPECT_EQ(c.steps, steps) << "fail " << c.failAt << " exit " << c.exitAt;
        EXPECT_EQ(c.percents, Percents(run));
        EXPECT_EQ(c.result, run.events.back().result);
    }
}

TEST(DeviceSimDownloadTest, CancelEndsAtTheNextStepWithTheCancelledResult) {
    SimTransferPlan plan;
    plan.rate = 1000;
    ComPtr<IStream> stream = NewMemoryStream();
    SimDownload download(Bytes(2000), stream, plan);
    SimDownload::Event event;
    ASSERT_TRUE(download.Next(0, &event));
    ASSERT_TRUE(download.Next(100, &event));
    EXPECT_EQ(Step::Progress, event.step);
    download.Cancel();
    ASSERT_TRUE(download.Next(100, &event));
    EXPECT_EQ(Step::Finish, event.step);
    EXPECT_EQ(HRESULT_FROM_WIN32(ERROR_CANCELLED), event.result);
    EXPECT_TRUE(download.Ended());
    EXPECT_FALSE(download.Next(5000, &event));
    EXPECT_EQ(100u, StreamBytes(stream.Get()).size());  // what was written stays
}
