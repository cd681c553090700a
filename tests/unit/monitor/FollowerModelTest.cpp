#include "FakeCompression.h"
#include "FollowedWorld.h"
#include "TestJoin.h"
#include "framework/LogEntry.h"
#include "monitor/FileFollower.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <string_view>
#include <vector>

using namespace zrm;

namespace {

constexpr std::chrono::seconds rotateWait{2};

/// A follower of a world that is started, stopped and killed, and what it delivers.
class FollowedRun {
public:
    FollowedRun(FollowedWorld& world, std::shared_ptr<const LineJoin> join, std::mt19937& random)
        : m_world(world), m_join(std::move(join)), m_random(random) {
        start();
    }

    bool isRunning() const { return m_follower != nullptr; }

    void start() {
        FileFollower::Options options;
        options.fromBeginning = true;
        options.rotateWait = rotateWait;
        options.join = m_join;
        m_follower = std::make_unique<FileFollower>(m_world.path(), options, m_ledger);
        if (m_stored.position) {
            m_follower->resumeAt(*m_stored.position);
        }
        m_world.noteStart(m_stored.position.has_value(), m_stored.lateFiles);
        look(std::chrono::milliseconds(0));
    }

    void look(std::chrono::milliseconds passed) {
        m_now += passed;
        m_world.noteLook();
        if (!m_follower->isQuiet() && m_follower->look({m_now, 0})) {
            while (const char* const entry =
                       testing::Test::HasFailure() ? nullptr : m_follower->next()) {
                take(entry, m_follower->text());
                m_world.noteDelivered(m_delivered);
                if (m_random() % 8 == 0) {
                    remember();
                }
            }
        }
        m_follower->noteProgress();
        m_world.noteDelivered(m_delivered);
        remember();
    }

    void stop() {
        look(std::chrono::milliseconds(0));
        end(m_places.back());
    }

    /// The history has only what was stored with an older position.
    void kill() {
        const std::size_t back = std::min<std::size_t>(m_random() % 12, m_places.size() - 1);
        end(Place(m_places[m_places.size() - 1 - back]));
    }

    /// Everything that was there to be read was.
    void expectAll() {
        const auto& entries = m_world.entries();
        for (std::size_t i = static_cast<std::size_t>(m_delivered + 1); i < entries.size(); ++i) {
            if (!entries[i].mayMiss) {
                const auto failure = m_ledger.failure();
                ADD_FAILURE() << "not delivered: " << entries[i].text.substr(0, 40) << "; "
                              << followStateText(m_ledger.state()) << " "
                              << (m_ledger.generation() ? m_ledger.generation()->path : "nothing")
                              << " at " << m_ledger.position() << ", "
                              << (failure ? failure->call : "no failure");
                return;
            }
        }
        for (std::size_t i = 0; i < m_world.lateEntries().size(); ++i) {
            EXPECT_TRUE(isTaken(i) || m_world.lateEntries()[i].mayMiss)
                << "not delivered: " << m_world.lateEntries()[i].text;
        }
    }

    std::size_t delivered = 0;
    std::size_t deliveredLate = 0;

private:
    struct Place {
        int last = -1;         ///< the last whole entry before it
        int begun = -1;        ///< the last of which there is something before it
        std::size_t given = 0; ///< how much of that, with the newline
        std::optional<LogPosition> position{};
        std::size_t late = 0; ///< late entries that were given
        FollowedWorld::Files lateFiles{};
    };

    void remember() {
        const auto position = m_follower->position();
        FollowedWorld::Files lateFiles;
        for (const LogPosition& file : position.value_or(LogPosition{}).late.files()) {
            lateFiles.insert(m_world.fileAt(file.inode));
        }
        m_places.push_back({m_delivered, m_begun, m_given, position, m_late.size(), lateFiles});
        if (m_places.size() > 50) {
            m_places.erase(m_places.begin(), m_places.begin() + 25);
        }
    }

    void end(const Place& place) {
        m_follower.reset();
        m_stored = place;
        m_delivered = place.last;
        m_begun = place.begun;
        m_given = place.given;
        m_late.resize(place.late);
        m_places = {place};
        m_world.noteDelivered(m_delivered);
        m_world.noteEnd(m_begun);
    }

    bool isTaken(std::size_t late) const {
        return std::find(m_late.begin(), m_late.end(), late) != m_late.end();
    }

    /// What comes late to a rotated file has no place among the other entries.
    void takeLate(std::string_view text) {
        ++deliveredLate;
        const auto& entries = m_world.lateEntries();
        const auto number =
            static_cast<std::size_t>(std::atoi(std::string(text.substr(1, 10)).c_str()));
        ASSERT_LT(number, entries.size());
        ASSERT_EQ(text, entries[number].text);
        ASSERT_FALSE(isTaken(number)) << "twice: " << text;
        for (std::size_t i = 0; i < number; ++i) {
            ASSERT_TRUE(entries[i].file != entries[number].file || isTaken(i) || entries[i].mayMiss)
                << "passed over: " << entries[i].text << " before " << text;
        }
        m_late.push_back(number);
    }

    void take(std::string_view judged, std::string_view text) {
        if (text.starts_with('L')) {
            takeLate(text);
            return;
        }
        ++delivered;
        const std::size_t firstLine = std::min<std::size_t>(text.find('\n'), 2046);
        ASSERT_EQ(judged, std::string(text.substr(0, firstLine)) + '\n');
        const auto& entries = m_world.entries();
        // What comes late continues an entry that was given before.
        const bool isLate = text.starts_with(' ');
        const int number = isLate ? m_begun : std::atoi(std::string(text.substr(0, 10)).c_str());
        ASSERT_LT(static_cast<std::size_t>(number), entries.size());
        const FollowedWorld::Entry& entry = entries[static_cast<std::size_t>(number)];
        const std::size_t from = isLate ? m_given : 0;
        const std::size_t length = std::min(text.size(), EntryKeep::longestText);
        ASSERT_LE(from, entry.text.size()) << "late, but all of it was given: " << text;
        ASSERT_EQ(text, std::string_view(entry.text).substr(from, length));
        ASSERT_GT(number, isLate ? m_delivered : m_begun) << "twice: " << text.substr(0, 40);
        for (int i = m_delivered + 1; i < number; ++i) {
            ASSERT_TRUE(entries[static_cast<std::size_t>(i)].mayMiss)
                << "passed over: " << entries[static_cast<std::size_t>(i)].text.substr(0, 40)
                << " before " << number;
        }
        const bool isWhole = from + length == std::min(entry.text.size(), EntryKeep::longestText);
        ASSERT_TRUE(isWhole || (entry.isInParts && entry.text[from + length] == '\n'))
            << "only a part: " << text;
        m_begun = number;
        m_given = from + length + 1;
        m_delivered = isWhole ? number : number - 1;
    }

    FollowedWorld& m_world;
    const std::shared_ptr<const LineJoin> m_join;
    std::mt19937& m_random;
    FollowLedger m_ledger;
    std::unique_ptr<FileFollower> m_follower;
    std::chrono::steady_clock::time_point m_now{std::chrono::hours(1)};
    int m_delivered = -1;
    int m_begun = -1;
    std::size_t m_given = 0;
    std::vector<std::size_t> m_late; ///< late entries, as they were given
    Place m_stored;
    std::vector<Place> m_places{Place{}};
};

class FollowerModel : public testing::Test {
protected:
    /// One thing that happens. Returns its name.
    const char* act(FollowedWorld& world, FollowedRun& run) {
        const auto die = m_random() % 100;
        if (die < 32) {
            world.write(static_cast<int>(1 + m_random() % 4));
            return "write";
        }
        if (die < 36) {
            world.writeLate();
            return "write late";
        }
        if (die < 39) {
            world.writeHalf();
            return "half";
        }
        if (die < 44) {
            world.rotateByName(true);
            return "rename and create";
        }
        if (die < 47) {
            world.rotateByName(false);
            return "rename";
        }
        if (die < 51) {
            world.copyAndTruncate(false);
            return "copytruncate";
        }
        if (die < 52) {
            world.copyAndTruncate(true);
            return "copytruncate that loses lines";
        }
        if (die < 53) {
            world.truncate();
            return "truncate";
        }
        if (die < 57) {
            world.compress();
            return "compress";
        }
        if (die < 58) {
            world.removeGeneration();
            return "remove a generation";
        }
        if (die < 59) {
            world.removeAndCreate();
            return "remove and create";
        }
        if (die < 61) {
            world.replace();
            return "replace";
        }
        if (die < 66) {
            world.reopen();
            return "reopen";
        }
        if (die < 67 && m_random() % 10 == 0) {
            world.writeLongLine();
            return "long line";
        }
        if (die < 70) {
            return toggle(run);
        }
        if (run.isRunning()) {
            const std::chrono::milliseconds passed(m_random() % 3000);
            if (world.isReopenDue()) {
                world.reopen();
            }
            run.look(passed);
            return "look";
        }
        return "nothing";
    }

    const char* toggle(FollowedRun& run) {
        if (!run.isRunning()) {
            run.start();
            return "start";
        }
        if (m_random() % 2 == 0) {
            run.stop();
            return "stop";
        }
        run.kill();
        return "kill";
    }

    /// Some hundred actions on one log.
    void live(FollowedWorld::Style style, int actions) {
        const unsigned mostLines = m_random() % 2 == 0 ? 1 : 5;
        const LineJoin::Limits limits{.wait = std::chrono::milliseconds(m_random() % 4000)};
        FollowedWorld world(style, mostLines, m_random);
        FollowedRun run(world, mostLines > 1 ? TestJoin::indented(limits) : nullptr, m_random);
        std::vector<std::string> done;
        for (int i = 0; i < actions && !HasFailure(); ++i) {
            done.emplace_back(act(world, run));
        }
        if (HasFailure()) {
            world.print();
        }
        if (!run.isRunning()) {
            run.start();
        }
        world.reopen();
        world.write(1);
        for (int i = 0; i < 40 && !HasFailure(); ++i) {
            run.look(rotateWait);
        }
        run.expectAll();
        if (HasFailure()) {
            const std::size_t first = done.size() > 60 ? done.size() - 60 : 0;
            for (std::size_t i = first; i < done.size(); ++i) {
                std::fprintf(stderr, "%s; ", done[i].c_str());
            }
            std::fputc('\n', stderr);
        }
        m_delivered += run.delivered;
        m_deliveredLate += run.deliveredLate;
    }

    std::mt19937 m_random;
    std::size_t m_delivered = 0;
    std::size_t m_deliveredLate = 0;
};

TEST_F(FollowerModel, DeliversEachEntryOnceAndInOrder) {
    const FakeCompression compression;
    const char* const wanted = std::getenv("ZRM_FOLLOWER_ACTIONS");
    const char* const seeds = std::getenv("ZRM_FOLLOWER_SEED");
    const int actions = wanted != nullptr ? std::atoi(wanted) : 100'000;
    const unsigned first = seeds != nullptr ? static_cast<unsigned>(std::atoi(seeds)) : 1;
    constexpr int perLog = 250;
    unsigned seed = first;
    for (int done = 0; done < actions && !HasFailure(); done += perLog, ++seed) {
        SCOPED_TRACE("ZRM_FOLLOWER_SEED=" + std::to_string(seed));
        m_random.seed(seed);
        const auto style = static_cast<FollowedWorld::Style>(m_random() % 3);
        live(style, perLog);
    }
    std::printf("seeds %u to %u, %zu entries and %zu late ones\n", first, seed - 1, m_delivered,
                m_deliveredLate);
    EXPECT_GT(m_delivered, static_cast<std::size_t>(actions) / 4);
    EXPECT_GT(m_deliveredLate, static_cast<std::size_t>(actions) / 400);
}

} // namespace
