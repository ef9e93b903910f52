// The timing module's driver stand-in, tiktal_devd, as a separate process driven over its sockets:
// the answers to the request packets, the refusals, waits and their cancel, the test controls, the
// record of packets, many connections at once, and a clean stop.
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <algorithm>
#include <atomic>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

#include "device_daemon.h"
#include "deviceRequests.h"

namespace {

using Bytes = std::vector<std::uint8_t>;
using tiktalq300::requests::kCancelWaitCode;
using tiktalq300::requests::kRequests;
using tiktalq300::requests::kWaitCode;

constexpr std::uint32_t kWrite = 0x80012004u;
constexpr std::uint32_t kRead = 0x80012008u;
constexpr std::uint32_t kReset = 0x80022004u;
constexpr std::uint32_t kReadInfo1 = 0x807F2004u;
constexpr std::uint32_t kRouting0 = 0x80802000u;
constexpr std::uint32_t kRouting10 = 0x8080202Cu;
constexpr std::uint32_t kTerminals[] = {58, 65, 72, 79, 86, 93};

// Packet fields, little-endian.
struct Fields {
    Bytes bytes;
    Fields& u8(std::uint8_t v) { return put(v, 1); }
    Fields& u16(std::uint16_t v) { return put(v, 2); }
    Fields& u32(std::uint32_t v) { return put(v, 4); }
    Fields& u64(std::uint64_t v) { return put(v, 8); }
    Fields& put(std::uint64_t v, int width) {
        for (int i = 0; i < width; ++i) bytes.push_back(static_cast<std::uint8_t>(v >> (8 * i)));
        return *this;
    }
};

std::uint32_t u32At(const Bytes& bytes, std::size_t offset) {
    EXPECT_LE(offset + 4, bytes.size());
    if (offset + 4 > bytes.size()) return 0;
    std::uint32_t value = 0;
    for (int i = 3; i >= 0; --i) value = (value << 8) | bytes[offset + i];
    return value;
}

std::int32_t statusOf(const Bytes& output) { return static_cast<std::int32_t>(u32At(output, output.size() - 4)); }

struct Answer {
    std::int32_t osError = -1;
    Bytes output;
};

// A connection to the device socket; every receive gives up after 10 s, so a missing answer fails
// the test instead of hanging it.
class Connection {
public:
    explicit Connection(const std::string& path) : _fd(socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
        const timeval limit{10, 0};
        setsockopt(_fd, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
        _connected = connect(_fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    }
    ~Connection() { close(_fd); }
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    bool connected() const { return _connected; }

    void sendRaw(const Bytes& message) {
        ASSERT_EQ(send(_fd, message.data(), message.size(), MSG_NOSIGNAL), static_cast<ssize_t>(message.size()));
    }
    void sendRequest(std::uint32_t code, std::uint32_t outputSize, const Bytes& input) {
        Bytes message = Fields().u32(code).u32(outputSize).bytes;
        message.insert(message.end(), input.begin(), input.end());
        sendRaw(message);
    }
    // The next answer; its byte count must match the bytes that follow it.
    Answer receive() {
        Bytes message(4096);
        const ssize_t got = recv(_fd, message.data(), message.size(), 0);
        Answer answer;
        if (got < 8) {
            ADD_FAILURE() << "no answer (recv gave " << got << ", " << std::strerror(errno) << ")";
            return answer;
        }
        message.resize(static_cast<std::size_t>(got));
        answer.osError = static_cast<std::int32_t>(u32At(message, 0));
        answer.output.assign(message.begin() + 8, message.end());
        EXPECT_EQ(u32At(message, 4), answer.output.size());
        return answer;
    }
    Answer request(std::uint32_t code, std::uint32_t outputSize, const Bytes& input) {
        sendRequest(code, outputSize, input);
        return receive();
    }
    // True when an answer can be received at once.
    bool answerPending() {
        pollfd ready{_fd, POLLIN, 0};
        return poll(&ready, 1, 0) == 1;
    }
    // True when the daemon closed the connection (instead of answering).
    bool closedByPeer() {
        char byte;
        return recv(_fd, &byte, 1, 0) == 0;
    }

private:
    int _fd;
    bool _connected = false;
};

Bytes writePacket(std::uint32_t terminal, std::uint32_t value, std::int32_t status = 0) {
    return Fields().u32(terminal).u32(value).u32(static_cast<std::uint32_t>(status)).bytes;
}
Bytes readPacket(std::uint32_t terminal) { return Fields().u32(terminal).u32(0).bytes; }
Bytes statusOnly() { return Fields().u32(0).bytes; }
Bytes waitPacket(std::uint32_t arg2, std::uint16_t arg1, std::uint8_t arg3) {
    return Fields().u64(0x7ffc0000u).u64(~0ull).u32(arg2).u16(arg1).u8(arg3).u8(0).bytes;
}
Bytes cancelPacket(std::uint64_t id) { return Fields().u32(static_cast<std::uint32_t>(id)).u32(0).bytes; }

// An armed wait's identifier from its first answer; 0 when there is none.
std::uint64_t armedIdentifier(const Answer& armed) {
    EXPECT_EQ(armed.osError, 0);
    EXPECT_EQ(armed.output.size(), 8u);
    if (armed.output.size() != 8) return 0;
    return u32At(armed.output, 0) | static_cast<std::uint64_t>(u32At(armed.output, 4)) << 32;
}

class Devd : public ::testing::Test {
protected:
    DeviceDaemon daemon;
};

// ---- answers to valid packets

TEST_F(Devd, TerminalValuesAreKeptPerTerminalAndReadBack) {
    Connection device(daemon.path());
    for (const std::uint32_t terminal : kTerminals) {
        const Answer unwritten = device.request(kRead, 8, readPacket(terminal));
        EXPECT_EQ(unwritten.osError, 0);
        EXPECT_EQ(unwritten.output, Bytes(8, 0)) << "a terminal never written reads 0";
    }
    for (const std::uint32_t terminal : kTerminals) {
        const Answer written = device.request(kWrite, 4, writePacket(terminal, terminal * 1000 + 1));
        EXPECT_EQ(written.osError, 0);
        EXPECT_EQ(written.output, Bytes(4, 0));
    }
    device.request(kWrite, 4, writePacket(93, 4294967295u));  // the whole unsigned range
    for (const std::uint32_t terminal : kTerminals) {
        const Answer read = device.request(kRead, 8, readPacket(terminal));
        EXPECT_EQ(u32At(read.output, 0), terminal == 93 ? 4294967295u : terminal * 1000 + 1);
        EXPECT_EQ(statusOf(read.output), 0);
    }
    const auto values = daemon.terminalValues();
    EXPECT_EQ(values.size(), 6u);
    EXPECT_EQ(values.at(58), 58001u);
    EXPECT_EQ(values.at(93), 4294967295u);
}

TEST_F(Devd, TerminalsTheModuleLacksAreRefusedWithADriverStatus) {
    Connection device(daemon.path());
    for (const std::uint32_t terminal : {0u, 57u, 59u, 94u, 0xFFFFFFFFu}) {
        const Answer written = device.request(kWrite, 4, writePacket(terminal, 7));
        EXPECT_EQ(written.osError, 0);
        EXPECT_EQ(statusOf(written.output), -52005);
        const Answer read = device.request(kRead, 8, readPacket(terminal));
        EXPECT_EQ(u32At(read.output, 0), 0u);
        EXPECT_EQ(statusOf(read.output), -52005);
    }
    EXPECT_TRUE(daemon.terminalValues().empty());
}

TEST_F(Devd, ResetClearsTerminalValuesAndTheRoutingCount) {
    Connection device(daemon.path());
    device.request(kWrite, 4, writePacket(58, 2500));
    device.request(kWrite, 4, writePacket(65, 1));
    device.request(kRouting0, 8, statusOnly());
    const Answer reset = device.request(kReset, 4, statusOnly());
    EXPECT_EQ(reset.osError, 0);
    EXPECT_EQ(reset.output, Bytes(4, 0));
    EXPECT_TRUE(daemon.terminalValues().empty());
    EXPECT_EQ(u32At(device.request(kRead, 8, readPacket(58)).output, 0), 0u);
    EXPECT_EQ(u32At(device.request(kRouting0, 8, statusOnly()).output, 0), 1u) << "the count starts again";
}

TEST_F(Devd, InfoRequestsAnswerTheModelData) {
    Connection device(daemon.path());
    const std::uint32_t expected[] = {3, 0x5A3C7405, 0x02030011, 0x20231115, 6, 41250};
    for (std::uint32_t i = 0; i < 6; ++i) {
        const Answer info = device.request(kReadInfo1 + 4 * i, 8, statusOnly());
        EXPECT_EQ(info.osError, 0);
        ASSERT_EQ(info.output.size(), 8u);
        EXPECT_EQ(u32At(info.output, 0), expected[i]) << "readInfo" << i + 1;
        EXPECT_EQ(statusOf(info.output), 0);
    }
    EXPECT_NE(expected[1] >> 16, 0u) << "readInfo2 has a high half for the caller to drop";
}

TEST_F(Devd, RoutingRequestsCountThemselvesAndGiveBackTheirValues) {
    Connection device(daemon.path());
    // routingRequest1: a1..a8 and io9; r is a1, v is io9.
    const Bytes request1 = Fields().u32(11).u32(12).u64(13).u32(14).u32(0).u64(15).u32(16).u32(17).u64(18).u32(19).u32(0).bytes;
    const Answer answer1 = device.request(0x80802004u, 12, request1);
    EXPECT_EQ(u32At(answer1.output, 0), 11u);
    EXPECT_EQ(u32At(answer1.output, 4), 19u);
    EXPECT_EQ(statusOf(answer1.output), 0);
    for (const std::uint32_t code : {0x8080200Cu, 0x8080201Cu}) {  // a1, pad, a2 (u64), io3
        const Answer answer = device.request(code, 8, Fields().u32(1).u32(0).u64(2).u32(0xABCD).u32(0).bytes);
        EXPECT_EQ(u32At(answer.output, 0), 0xABCDu);
    }
    const Answer answer10 = device.request(kRouting10, 8, Fields().u32(41).u32(42).u32(43).u32(44).u32(0).u32(0).bytes);
    EXPECT_EQ(u32At(answer10.output, 0), 41u);
    for (const std::uint32_t code : {0x80802008u, 0x80802010u, 0x80802014u, 0x80802018u}) {
        const Answer answer = device.request(code, 4, Fields().u32(5).u32(0).bytes);
        EXPECT_EQ(answer.output, Bytes(4, 0));
    }
    EXPECT_EQ(device.request(0x80802020u, 4, Fields().u64(1).u32(2).u32(0).bytes).output, Bytes(4, 0));
    EXPECT_EQ(device.request(0x80802028u, 4, Fields().u32(1).u32(2).u32(0).bytes).output, Bytes(4, 0));
    EXPECT_EQ(u32At(device.request(kRouting0, 8, statusOnly()).output, 0), 11u) << "ten requests before it, this one counts too";
}

TEST_F(Devd, EveryRequestAnswersItsOutputPacketAndNoMoreWhateverTheRoom) {
    Connection device(daemon.path());
    for (const auto& entry : kRequests) {
        for (const std::uint32_t room : {entry.outputSize, entry.outputSize + 100}) {
            const Answer answer = device.request(entry.code, room, Bytes(entry.inputSize, 0));
            EXPECT_EQ(answer.osError, 0) << entry.name;
            EXPECT_EQ(answer.output.size(), entry.outputSize) << entry.name;
        }
    }
}

// ---- refusals

TEST_F(Devd, WrongSizesShortMessagesAndUnknownCodesAreRefusedWithEinval) {
    Connection device(daemon.path());
    const auto refused = [&](const Answer& answer, const std::string& what) {
        EXPECT_EQ(answer.osError, EINVAL) << what;
        EXPECT_TRUE(answer.output.empty()) << what;
    };
    for (const auto& entry : kRequests) {
        refused(device.request(entry.code, entry.outputSize, Bytes(entry.inputSize - 1, 0)), std::string(entry.name) + " short input");
        refused(device.request(entry.code, entry.outputSize, Bytes(entry.inputSize + 1, 0)), std::string(entry.name) + " long input");
        refused(device.request(entry.code, entry.outputSize - 1, Bytes(entry.inputSize, 0)), std::string(entry.name) + " little room");
    }
    refused(device.request(kWaitCode, 0, Bytes(23, 0)), "short wait");
    refused(device.request(kWaitCode, 0, Bytes(25, 0)), "long wait");
    refused(device.request(kCancelWaitCode, 0, Bytes(4, 0)), "short cancel");
    refused(device.request(0x80802024u, 8, statusOnly()), "the code between the routing requests");
    refused(device.request(0, 0, {}), "code 0");
    refused(device.request(0xFFFFFFFFu, 0xFFFFFFFFu, statusOnly()), "code ~0");
    for (std::size_t size = 1; size < 8; ++size) {
        device.sendRaw(Bytes(size, 0x80));
        refused(device.receive(), "a message of " + std::to_string(size) + " bytes");
    }
    device.sendRaw({});
    refused(device.receive(), "an empty message");
    device.sendRequest(kRead, 8, Bytes(5000, 0));
    refused(device.receive(), "a message longer than any request");
    // The connection still serves after all of that.
    EXPECT_EQ(device.request(kRead, 8, readPacket(58)).osError, 0);
}

TEST_F(Devd, ARefusedMessageDoesNotCarryOutTheRequestNorUseItsDirective) {
    Connection device(daemon.path());
    daemon.failNext(kWrite, -1);
    device.request(kWrite, 4, Bytes(11, 0x3A));
    EXPECT_TRUE(daemon.terminalValues().empty());
    EXPECT_EQ(statusOf(device.request(kWrite, 4, writePacket(58, 1)).output), -1) << "the directive waited for a valid one";
}

// ---- waits

TEST_F(Devd, AWaitIsArmedThenAnsweredWhenSignalled) {
    Connection waiter(daemon.path());
    waiter.sendRequest(kWaitCode, 0, waitPacket(0x12345678, 0xBEEF, 0x5A));
    const std::uint64_t id = armedIdentifier(waiter.receive());
    ASSERT_NE(id, 0u);
    EXPECT_LE(id, 0xFFFFFFFFu) << "a cancel carries 32 bits of it";
    EXPECT_EQ(daemon.armedWaits(), std::vector<std::uint64_t>{id});
    const auto packets = daemon.packets();
    ASSERT_EQ(packets.size(), 1u);
    EXPECT_EQ(packets[0].input, waitPacket(0x12345678, 0xBEEF, 0x5A));

    daemon.signalWait(id);
    const Answer ended = waiter.receive();
    EXPECT_EQ(ended.osError, 0);
    EXPECT_TRUE(ended.output.empty());
    EXPECT_TRUE(daemon.armedWaits().empty());
    EXPECT_THROW(daemon.signalWait(id), std::runtime_error) << "a wait ends once";
    // The connection serves requests again.
    EXPECT_EQ(waiter.request(kRead, 8, readPacket(58)).osError, 0);
}

TEST_F(Devd, AWaitIsCancelledFromAnotherConnectionOnce) {
    Connection waiter(daemon.path()), other(daemon.path());
    waiter.sendRequest(kWaitCode, 0, waitPacket(1, 2, 3));
    const std::uint64_t id = armedIdentifier(waiter.receive());
    const Answer cancelled = other.request(kCancelWaitCode, 0, cancelPacket(id));
    EXPECT_EQ(cancelled.osError, 0);
    EXPECT_TRUE(cancelled.output.empty());
    const Answer ended = waiter.receive();
    EXPECT_EQ(ended.osError, ECANCELED);
    EXPECT_TRUE(ended.output.empty());
    EXPECT_EQ(other.request(kCancelWaitCode, 0, cancelPacket(id)).osError, ENOENT);
    EXPECT_EQ(other.request(kCancelWaitCode, 0, cancelPacket(0)).osError, ENOENT);
    EXPECT_EQ(other.request(kCancelWaitCode, 0, cancelPacket(987654)).osError, ENOENT);
}

TEST_F(Devd, WaitsHaveDistinctIdentifiersAndResetCancelsThemAll) {
    Connection first(daemon.path()), second(daemon.path()), other(daemon.path());
    first.sendRequest(kWaitCode, 0, waitPacket(1, 1, 1));
    second.sendRequest(kWaitCode, 0, waitPacket(2, 2, 2));
    const std::uint64_t a = armedIdentifier(first.receive()), b = armedIdentifier(second.receive());
    EXPECT_NE(a, b);
    EXPECT_EQ(daemon.armedWaits().size(), 2u);
    EXPECT_EQ(other.request(kReset, 4, statusOnly()).osError, 0);
    EXPECT_EQ(first.receive().osError, ECANCELED);
    EXPECT_EQ(second.receive().osError, ECANCELED);
    EXPECT_TRUE(daemon.armedWaits().empty());
}

TEST_F(Devd, AWaitWhoseCallerGoesAwayIsDisarmed) {
    {
        Connection waiter(daemon.path());
        waiter.sendRequest(kWaitCode, 0, waitPacket(1, 1, 1));
        armedIdentifier(waiter.receive());
    }
    for (int i = 0; i < 500 && !daemon.armedWaits().empty(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
    EXPECT_TRUE(daemon.armedWaits().empty());
}

TEST_F(Devd, AFailedWaitAnswersIdentifierZeroOrItsOsErrorAndNothingMore) {
    Connection waiter(daemon.path());
    daemon.failNext(kWaitCode, -52003);
    waiter.sendRequest(kWaitCode, 0, waitPacket(1, 1, 1));
    EXPECT_EQ(armedIdentifier(waiter.receive()), 0u);
    daemon.failSystemCall(kWaitCode, EIO);
    const Answer failed = waiter.request(kWaitCode, 0, waitPacket(1, 1, 1));
    EXPECT_EQ(failed.osError, EIO);
    EXPECT_TRUE(failed.output.empty());
    // The next answer on the connection is the next request's: nothing else followed.
    EXPECT_EQ(u32At(waiter.request(kReadInfo1, 8, statusOnly()).output, 0), 3u);
    EXPECT_TRUE(daemon.armedWaits().empty());
}

// ---- test controls

TEST_F(Devd, FailNextAnswersTheDriverStatusWithoutCarryingOutTheRequest) {
    Connection device(daemon.path());
    daemon.failNext(kWrite, -52009, 2);
    for (int i = 0; i < 2; ++i) {
        const Answer failed = device.request(kWrite, 4, writePacket(58, 10));
        EXPECT_EQ(failed.osError, 0);
        EXPECT_EQ(statusOf(failed.output), -52009);
    }
    EXPECT_TRUE(daemon.terminalValues().empty());
    EXPECT_EQ(statusOf(device.request(kWrite, 4, writePacket(58, 10)).output), 0) << "two only";
    daemon.failNext(kRead, 52011);  // a warning is a status like any other
    const Answer read = device.request(kRead, 8, readPacket(58));
    EXPECT_EQ(u32At(read.output, 0), 0u);
    EXPECT_EQ(statusOf(read.output), 52011);
    EXPECT_EQ(u32At(device.request(kRead, 8, readPacket(58)).output, 0), 10u);
}

TEST_F(Devd, FailSystemCallAnswersTheOsErrorWithNoOutput) {
    Connection device(daemon.path());
    daemon.failSystemCall(kReset, EIO, 1);
    daemon.failSystemCall(kWrite, ENODEV, 1);
    const Answer failed = device.request(kWrite, 4, writePacket(58, 10));
    EXPECT_EQ(failed.osError, ENODEV);
    EXPECT_TRUE(failed.output.empty());
    EXPECT_TRUE(daemon.terminalValues().empty()) << "not carried out";
    EXPECT_EQ(device.request(kRead, 8, readPacket(58)).osError, 0) << "directives are per control code";
    device.request(kWrite, 4, writePacket(58, 10));
    EXPECT_EQ(device.request(kReset, 4, statusOnly()).osError, EIO);
    EXPECT_EQ(daemon.terminalValues().size(), 1u) << "the failed reset cleared nothing";
    daemon.failSystemCall(kCancelWaitCode, EACCES);
    EXPECT_EQ(device.request(kCancelWaitCode, 0, cancelPacket(1)).osError, EACCES);
}

TEST_F(Devd, DelayNextHoldsOnlyThatAnswer) {
    Connection slow(daemon.path()), other(daemon.path());
    daemon.delayNext(kReadInfo1, 1000);
    const auto start = std::chrono::steady_clock::now();
    slow.sendRequest(kReadInfo1, 8, statusOnly());
    // Requests of two connections are taken in no set order: let the slow one take the delay.
    for (int i = 0; i < 1000 && daemon.packets().empty(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(1));
    EXPECT_EQ(other.request(kReadInfo1, 8, statusOnly()).osError, 0) << "another connection is not held";
    EXPECT_FALSE(slow.answerPending()) << "the delayed answer is still held";
    EXPECT_EQ(u32At(slow.receive().output, 0), 3u);
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(1000));
    EXPECT_EQ(slow.request(kReadInfo1, 8, statusOnly()).osError, 0) << "the next one is not delayed";
}

TEST_F(Devd, CloseOnNextReadsTheRequestThenClosesWithoutAnswer) {
    {
        Connection device(daemon.path());
        daemon.closeOnNext(kWrite);
        device.sendRequest(kWrite, 4, writePacket(58, 10));
        EXPECT_TRUE(device.closedByPeer());
    }
    EXPECT_TRUE(daemon.terminalValues().empty());
    ASSERT_EQ(daemon.packets().size(), 1u) << "the request was read";
    Connection again(daemon.path());
    EXPECT_EQ(statusOf(again.request(kWrite, 4, writePacket(58, 10)).output), 0) << "once only";
}

TEST_F(Devd, ControlsRefuseMalformedCommands) {
    const std::string path = daemon.path() + ".control";
    const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    ASSERT_EQ(connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    const std::string commands =
        "not json\n{\"command\":\"nothing\"}\n{\"command\":\"failNext\",\"code\":1}\n"
        "{\"command\":\"failNext\",\"code\":-1,\"status\":1}\n{\"command\":\"failSystemCall\",\"code\":1,\"errno\":0}\n"
        "{\"command\":\"delayNext\",\"code\":1,\"ms\":1.5}\n{\"command\":\"closeOnNext\",\"code\":1,\"count\":0}\n"
        "[1]\n{\"command\":\"armedWaits\"}\n";
    ASSERT_EQ(send(fd, commands.data(), commands.size(), MSG_NOSIGNAL), static_cast<ssize_t>(commands.size()));
    std::string answers;
    char buffer[4096];
    while (std::count(answers.begin(), answers.end(), '\n') < 9) {
        const ssize_t got = recv(fd, buffer, sizeof buffer, 0);
        ASSERT_GT(got, 0);
        answers.append(buffer, static_cast<std::size_t>(got));
    }
    close(fd);
    std::istringstream lines(answers);
    std::string line;
    for (int i = 0; i < 8; ++i) {
        std::getline(lines, line);
        EXPECT_NE(line.find("\"ok\":false"), std::string::npos) << line;
        EXPECT_NE(line.find("\"error\":"), std::string::npos) << line;
    }
    std::getline(lines, line);
    EXPECT_NE(line.find("\"ok\":true"), std::string::npos) << "the connection still serves: " << line;
}

// ---- the packet record

TEST_F(Devd, ThePacketRecordHoldsEveryMessageInOrderUntilCleared) {
    Connection device(daemon.path());
    device.request(kWrite, 4, writePacket(58, 0x01020304, 52011));
    device.request(kRead, 64, readPacket(65));
    device.request(0xDEAD, 2, Bytes{9, 8, 7});  // refused, still recorded
    device.sendRaw(Bytes(5, 1));                 // no whole header: not recorded
    device.receive();
    const auto packets = daemon.packets();
    ASSERT_EQ(packets.size(), 3u);
    EXPECT_EQ(packets[0].code, kWrite);
    EXPECT_EQ(packets[0].outputSize, 4u);
    EXPECT_EQ(packets[0].input, (Bytes{58, 0, 0, 0, 4, 3, 2, 1, 0x2B, 0xCB, 0, 0}));
    EXPECT_EQ(packets[1].code, kRead);
    EXPECT_EQ(packets[1].outputSize, 64u);
    EXPECT_EQ(packets[2].code, 0xDEADu);
    EXPECT_EQ(packets[2].input, (Bytes{9, 8, 7}));
    daemon.clearPackets();
    EXPECT_TRUE(daemon.packets().empty());
    device.request(kReset, 4, statusOnly());
    ASSERT_EQ(daemon.packets().size(), 1u);
    EXPECT_EQ(daemon.packets()[0].code, kReset);
}

// ---- many connections

TEST_F(Devd, ConcurrentConnectionsAreEachAnsweredInOrder) {
    constexpr int kConnections = 24, kRequestsEach = 200;
    Connection waiter(daemon.path());  // a wait stays armed throughout
    waiter.sendRequest(kWaitCode, 0, waitPacket(1, 1, 1));
    const std::uint64_t id = armedIdentifier(waiter.receive());
    std::vector<std::thread> clients;
    std::atomic<int> wrongAnswers{0};
    for (int c = 0; c < kConnections; ++c) {
        clients.emplace_back([&, c] {
            Connection device(daemon.path());
            if (!device.connected()) return void(++wrongAnswers);
            // All requests first, then the answers: each names its request.
            for (int i = 0; i < kRequestsEach; ++i)
                device.sendRequest(kRouting10, 8, Fields().u32(c * 100000 + i).u32(0).u32(0).u32(0).u32(0).u32(0).bytes);
            for (int i = 0; i < kRequestsEach; ++i) {
                const Answer answer = device.receive();
                if (answer.osError != 0 || u32At(answer.output, 0) != static_cast<std::uint32_t>(c * 100000 + i)) ++wrongAnswers;
            }
            const std::uint32_t terminal = kTerminals[c % 6];
            device.request(kWrite, 4, writePacket(terminal, 1));
        });
    }
    for (auto& client : clients) client.join();
    EXPECT_EQ(wrongAnswers, 0);
    EXPECT_EQ(daemon.packets().size(), 1u + kConnections * (kRequestsEach + 1));
    EXPECT_EQ(daemon.terminalValues().size(), 6u);
    daemon.signalWait(id);
    EXPECT_EQ(waiter.receive().osError, 0);
}

// ---- start and stop

bool exists(const std::string& path) {
    struct stat info {};
    return lstat(path.c_str(), &info) == 0;
}

TEST(DevdLifetime, AStopEndsConnectionsWaitsAndDelaysAndRemovesTheSockets) {
    DeviceDaemon daemon;
    const std::string path = daemon.path();
    ASSERT_TRUE(exists(path));
    ASSERT_TRUE(exists(path + ".control"));
    Connection waiter(path), slow(path), idle(path);
    waiter.sendRequest(kWaitCode, 0, waitPacket(1, 1, 1));
    armedIdentifier(waiter.receive());
    daemon.delayNext(kReadInfo1, 3600000);
    slow.sendRequest(kReadInfo1, 8, statusOnly());
    EXPECT_EQ(daemon.stop(), 0);
    EXPECT_FALSE(exists(path));
    EXPECT_FALSE(exists(path + ".control"));
    EXPECT_TRUE(waiter.closedByPeer());
    EXPECT_TRUE(slow.closedByPeer());
    EXPECT_TRUE(idle.closedByPeer());
    EXPECT_EQ(daemon.stop(), 0) << "later calls give the same status";
}

TEST(DevdLifetime, APeerThatGoesAwayBeforeItsAnswerDoesNotHarmTheDaemon) {
    DeviceDaemon daemon;
    for (int i = 0; i < 20; ++i) {
        Connection gone(daemon.path());
        daemon.delayNext(kReadInfo1, 20);
        gone.sendRequest(kReadInfo1, 8, statusOnly());
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    Connection device(daemon.path());
    EXPECT_EQ(device.request(kReadInfo1, 8, statusOnly()).osError, 0);
    EXPECT_EQ(daemon.stop(), 0);
}

TEST(DevdLifetime, AKilledDaemonsSocketIsReplacedButNoOtherFile) {
    const std::string folder = "/tmp/tiktal_devd_test." + std::to_string(getpid());
    std::filesystem::create_directories(folder);
    {
        DeviceDaemon first(folder + "/tiktal0");
        first.kill();
        EXPECT_TRUE(exists(folder + "/tiktal0")) << "a killed daemon leaves its socket";
        DeviceDaemon second(folder + "/tiktal0");
        Connection device(second.path());
        EXPECT_EQ(device.request(kReadInfo1, 8, statusOnly()).osError, 0);
    }
    std::ofstream(folder + "/plain") << "not a socket";
    EXPECT_THROW(DeviceDaemon(folder + "/plain"), std::runtime_error);
    std::ifstream kept(folder + "/plain");
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(kept), {}), "not a socket");
    std::filesystem::remove_all(folder);
}

}  // namespace
