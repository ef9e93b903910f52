// Starts the timing module's driver stand-in (tiktal_devd) as a child process and drives its test
// controls.
//
//   DeviceDaemon daemon;                        // a socket in a fresh temporary folder
//   daemon.failNext(0x80012008, -52005);        // the next readTerminalValue fails with -52005
//   open a proxy on daemon.path() ...
//   EXPECT_EQ(daemon.terminalValues().at(58), 2500u);
//
// The constructor returns once the daemon listens, and throws std::runtime_error when it does not
// within 10 s. The destructor stops it with SIGTERM, waits for it and removes the temporary folder.
// The child is also sent SIGTERM when the thread that started it ends: start it from a thread that
// outlives it. A control that the daemon refuses, or that cannot reach it, throws
// std::runtime_error.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <map>
#include <string>
#include <vector>

class DeviceDaemon {
public:
    struct Packet {
        std::uint32_t code;
        std::uint32_t outputSize;
        std::vector<std::uint8_t> input;
    };

    // The socket lies in a fresh temporary folder.
    DeviceDaemon();
    // The socket lies at `socketPath` (its folder must exist; for a simulated machine's
    // $TIKTAL_SYSROOT/dev/<entry>); the control socket beside it, with ".control" appended.
    explicit DeviceDaemon(std::string socketPath);
    ~DeviceDaemon();
    DeviceDaemon(const DeviceDaemon&) = delete;
    DeviceDaemon& operator=(const DeviceDaemon&) = delete;

    // The device interface path: the daemon's seqpacket socket.
    const std::string& path() const { return _path; }
    pid_t pid() const { return _pid; }

    // The next `count` requests of `code` are not carried out and answer `driverStatus` in their
    // trailing status field (a wait answers the identifier 0: not armed).
    void failNext(std::uint32_t code, std::int32_t driverStatus, int count = 1);
    // The next `count` requests of `code` answer the OS error `osError` (an errno value) with no
    // output, and are not carried out.
    // With `withOutput`, the requests are carried out and answer the error beside their output.
    void failSystemCall(std::uint32_t code, int osError, int count = 1, bool withOutput = false);
    // The answer of the next request of `code` waits `milliseconds` first.
    void delayNext(std::uint32_t code, int milliseconds);
    // The next request of `code` is read, then its connection is closed without an answer.
    void closeOnNext(std::uint32_t code);
    // The identifiers of the armed waits, in increasing order.
    std::vector<std::uint64_t> armedWaits();
    // Ends the armed wait `id` as signalled; throws when no such wait is armed.
    void signalWait(std::uint64_t id);
    // Every request message received (with a whole 8-byte header, refused ones included), in order.
    std::vector<Packet> packets();
    void clearPackets();
    // The terminal values written since the start or the last resetDevice, by terminal identifier.
    std::map<std::uint32_t, std::uint32_t> terminalValues();

    // Sends SIGTERM and waits; returns the exit status (0 after a clean stop), or 128 + signal when
    // it was killed. Later calls return the same value.
    int stop();
    // Sends SIGKILL and waits for the daemon to end: its socket files stay behind.
    void kill();

private:
    void start();
    // Sends one command line to the control socket and returns the answer's JSON text, which has
    // "ok": true; throws otherwise.
    std::string control(const std::string& commandJson);
    void end(int signal);

    std::string _program;
    std::string _temporaryFolder;  // made by the default constructor, removed by the destructor
    std::string _path;
    pid_t _pid = -1;
    int _exitStatus = -1;
};
