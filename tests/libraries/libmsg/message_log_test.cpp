// The message log's lines and sinks, under hostile arguments, several threads and processes, and busy descriptors.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include "libraries/libmsg/message_log.h"
#include "tests/support/log_lines.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::message_catcher;
using test_support::temp_dir;
using test_support::without_time;

namespace {

// Sends messages to standard error again, whatever way the test ends.
struct sink_restorer {
    ~sink_restorer() { set_message_sink(nullptr, nullptr); }
};

TEST(MessageLog, ALineShowsTimeSeverityComponentAndId)
{
    const message_catcher caught;
    PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 26, "syntax", "'1.2'");
    PrintMessage(MSG_COMPONENT_RDBM, MSG_ERROR, 31, "a", "b");
    PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 7);
    PrintMessage(28, MSG_INFORMATION, 12345);
    PrintMessage(28, 3, -1);

    const char* const lines[] = {
        "SEVERE SCH0026 syntax '1.2' does not exist",
        "ERROR RDB0031 The column name a is too long for the store and has been cut to b.",
        "WARNING SRV0007 The server is out of memory.",
        "INFORMATION C28-12345 component 28, severity 1, id 12345",
        "SEVERITY3 C28--0001 component 28, severity 3, id -1",
    };
    const auto messages = caught.messages();
    ASSERT_EQ(messages.size(), std::size(lines));
    for (std::size_t i = 0; i < messages.size(); ++i) {
        EXPECT_EQ(without_time(messages[i].line), lines[i]);
    }
    EXPECT_EQ(messages[0].text, "syntax '1.2' does not exist");
    EXPECT_EQ(messages[0].arguments, (std::vector<std::string>{"syntax", "'1.2'"}));
}

TEST(MessageLog, TheTimeIsThatOfTheLocalZone)
{
    setenv("TZ", "TST-05:30", 1);  // 5:30 ahead of UTC
    tzset();
    const message_catcher caught;
    const std::time_t before = std::time(nullptr);
    PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 7);
    const std::time_t after = std::time(nullptr);
    unsetenv("TZ");
    tzset();

    const std::string line = caught.messages().at(0).line;
    std::tm local = {};
    ASSERT_NE(strptime(line.c_str(), "%Y-%m-%dT%H:%M:%S", &local), nullptr) << line;
    const std::time_t logged = timegm(&local) - (5 * 60 + 30) * 60;
    EXPECT_LE(before, logged + 1);  // time() may lag behind the clock by a tick
    EXPECT_GE(after + 1, logged);
    EXPECT_EQ(line.substr(23, 5), "+0530");
}

TEST(MessageLog, HostileArgumentsCannotForgeALine)
{
    const message_catcher caught;
    const std::string hostile = "a\n2026-01-01T00:00:00.000+0000 SEVERE SRV0007 x\r\x1b[2J\t\x7f\xc2\x9b\xc3\xa9";
    PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, hostile.c_str());
    const auto message = caught.messages().at(0);
    EXPECT_EQ(message.text, "missing LDAPv3 spec for attribute " + hostile);
    EXPECT_EQ(without_time(message.line), "SEVERE SCH0033 missing LDAPv3 spec for attribute "
                                          "a\\n2026-01-01T00:00:00.000+0000 SEVERE SRV0007 x\\x0d\\x1b[2J\\x09\\x7f"
                                          "\\xc2\\x9b\xc3\xa9");
}

TEST(MessageLog, ARenderingIsCutOnlyBetweenCharactersAndTellsTheWholeLength)
{
    const char* const argument = "a\xc3\xa9\xe2\x82\xac\xf0\x9f\x98\x80z";  // characters of 1, 2, 3, 4 and 1 bytes
    char whole[100];
    const std::size_t length = getPrintedMessage(whole, sizeof whole, MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, argument);
    const std::string text = whole;
    ASSERT_EQ(length, text.size());

    for (std::size_t size = 1; size <= length + 2; ++size) {
        std::vector<char> buffer(size + 1, '#');
        EXPECT_EQ(getPrintedMessage(buffer.data(), size, MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, argument), length);
        EXPECT_EQ(buffer[size], '#') << "written behind the buffer of " << size;

        std::size_t expected = std::min(size - 1, length);
        while (expected < length && (static_cast<unsigned char>(text[expected]) & 0xC0) == 0x80) {
            --expected;
        }
        EXPECT_EQ(std::string(buffer.data()), text.substr(0, expected)) << "size " << size;
    }
    EXPECT_EQ(getPrintedMessage(nullptr, 0, MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, argument), length);

    char stray[40];  // continuation bytes without a character are cut anywhere
    getPrintedMessage(stray, sizeof stray, MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, "\x80\x80\x80\x80\x80\x80\x80\x80");
    EXPECT_EQ(std::string(stray).size(), sizeof stray - 1);
}

TEST(MessageLog, AFileIsMadePrivateAndAppendedToAndAFailureLeavesTheSinkAsItWas)
{
    const sink_restorer restore;
    const temp_dir folder;
    const mode_t mask = umask(022);
    ASSERT_EQ(set_message_file(folder.path("new").c_str()), 0);
    umask(mask);
    struct stat status = {};
    ASSERT_EQ(stat(folder.path("new").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777u, 0640u);

    ASSERT_EQ(set_message_file(folder.write("old", "kept\n").c_str()), 0);
    EXPECT_EQ(set_message_file(folder.path("missing/log").c_str()), ENOENT);
    EXPECT_EQ(set_message_file(folder.path().c_str()), EISDIR);
    EXPECT_EQ(set_message_file(nullptr), EINVAL);
    PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
    EXPECT_EQ(folder.read("old").substr(0, 5), "kept\n");
    EXPECT_EQ(test_support::lines_of(folder.read("old")).size(), 2u);
    EXPECT_EQ(folder.read("new"), "");

    const message_catcher caught;
    EXPECT_EQ(set_message_file(folder.path("missing/log").c_str()), ENOENT);
    PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
    EXPECT_EQ(caught.count(), 1u);
}

TEST(MessageLog, ADescriptorThatFailsHalfWayOrIsMissingSpoilsNoOtherLine)
{
    const temp_dir folder;
    const std::string path = folder.path("log");
    const auto in_a_child = [](const auto& action) {
        const pid_t pid = fork();
        if (pid == 0) {
            action();
            _exit(0);
        }
        int status = -1;
        EXPECT_EQ(waitpid(pid, &status, 0), pid);
        EXPECT_EQ(status, 0);
    };
    in_a_child([&] {
        std::signal(SIGXFSZ, SIG_IGN);
        set_message_file(path.c_str());
        PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
        struct stat status = {};
        stat(path.c_str(), &status);
        const auto half = static_cast<rlim_t>(status.st_size + 10);
        for (const rlimit& limit : {rlimit{half, RLIM_INFINITY}, {RLIM_INFINITY, RLIM_INFINITY}}) {
            setrlimit(RLIMIT_FSIZE, &limit);
            PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
        }
    });
    const std::vector<std::string> lines = test_support::lines_of(folder.read("log"));
    ASSERT_EQ(lines.size(), 3u);
    EXPECT_EQ(lines[1], lines[1].substr(0, 10));
    EXPECT_EQ(without_time(lines[2]), without_time(lines[0]));

    in_a_child([&] {
        close(STDERR_FILENO);
        set_message_file(folder.path("first").c_str());
        PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
        set_message_sink(nullptr, nullptr);  // back to a standard error that isn't there
        PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
    });
    EXPECT_EQ(test_support::lines_of(folder.read("first")).size(), 1u);
}

TEST(MessageLog, LoggingKeepsErrno)
{
    const sink_restorer restore;
    ASSERT_EQ(set_message_file("/dev/full"), 0);  // every write fails
    errno = ERANGE;
    PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, 7);
    EXPECT_EQ(errno, ERANGE);
}

// Lines of several lengths, each made of one letter, so that a line mixed from two is seen.
void log_letters(char letter, int lines)
{
    for (int i = 0; i < lines; ++i) {
        const std::string text(static_cast<std::size_t>(i % 7) * 900 + 1, letter);
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
    }
}

void expect_whole_lines(const std::string& log, std::size_t count)
{
    const auto lines = test_support::lines_without_time(log);
    EXPECT_EQ(lines.size(), count);
    const std::string front = "SEVERE SCH0033 missing LDAPv3 spec for attribute ";
    const auto broken = std::count_if(lines.begin(), lines.end(), [&](const std::string& line) {
        return line.size() <= front.size() || !line.starts_with(front) ||
               line.find_first_not_of(line.back(), front.size()) != std::string::npos;
    });
    EXPECT_EQ(broken, 0);
}

TEST(MessageLog, LinesOfThreadsAndProcessesStayWholeAndNoneIsLostWhileTheSinkChanges)
{
    const sink_restorer restore;
    const temp_dir folder;
    const std::string path = folder.path("log");
    std::vector<pid_t> children;
    for (int child = 0; child < 3; ++child) {
        const pid_t pid = fork();
        ASSERT_GE(pid, 0);
        if (pid == 0) {
            const int opened = set_message_file(path.c_str());
            log_letters(static_cast<char>('a' + child), 300);
            _exit(opened);
        }
        children.push_back(pid);
    }

    ASSERT_EQ(set_message_file(path.c_str()), 0);
    std::atomic<std::size_t> received = 0;
    const auto count = [](void* context, const message_record&) { ++*static_cast<std::atomic<std::size_t>*>(context); };
    std::atomic<int> running = 4;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            log_letters(static_cast<char>('A' + i), 300);
            --running;
        });
    }
    while (running > 0) {
        set_message_sink(count, &received);
        std::this_thread::yield();
        EXPECT_EQ(set_message_file(path.c_str()), 0);
        std::this_thread::sleep_for(std::chrono::microseconds(100));
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    for (const pid_t child : children) {
        int status = -1;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
    }
    expect_whole_lines(folder.read("log"), 7 * 300 - received);
}

TEST(MessageLog, ABusyDescriptorAndSignalsLoseNothing)
{
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    ASSERT_EQ(fcntl(ends[1], F_SETFL, O_NONBLOCK), 0);
    fcntl(ends[1], F_SETPIPE_SZ, 4096);
    const int standard_error = dup(STDERR_FILENO);
    ASSERT_GE(standard_error, 0);
    ASSERT_EQ(dup2(ends[1], STDERR_FILENO), STDERR_FILENO);
    close(ends[1]);

    struct sigaction action = {};
    struct sigaction old_action = {};
    action.sa_handler = [](int) {};  // without SA_RESTART: calls come back with EINTR
    sigaction(SIGALRM, &action, &old_action);
    const itimerval often = {{0, 500}, {0, 500}};
    const itimerval never = {};
    setitimer(ITIMER_REAL, &often, nullptr);

    std::string received;
    std::thread reader([&] {
        char piece[1500];
        ssize_t got;
        while ((got = read(ends[0], piece, sizeof piece)) > 0 || (got < 0 && errno == EINTR)) {
            received.append(piece, got > 0 ? static_cast<std::size_t>(got) : 0);
        }
    });
    const std::string text(300000, 'x');
    PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
    log_letters('y', 60);

    setitimer(ITIMER_REAL, &never, nullptr);
    dup2(standard_error, STDERR_FILENO);  // closes the pipe's writing end
    close(standard_error);
    reader.join();
    close(ends[0]);
    sigaction(SIGALRM, &old_action, nullptr);
    expect_whole_lines(received, 61);
    EXPECT_NE(received.find(text + "\n"), std::string::npos);
}

}  // namespace
