// A peer on the daemon socket that records, byte for byte, what each connection carried.
#ifndef FILEINDEX_TESTS_FRAME_LISTENER_H
#define FILEINDEX_TESTS_FRAME_LISTENER_H

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace fileindex_test {

class FrameListener {
public:
    // What the listener does with a connection once accepted.
    enum class Mode {
        kReadAll,        // read until the sender closes
        kCloseAtOnce,    // close without reading anything
        kStallThenRead,  // let each connection wait 2.5 s, past any sender's time-out, then read it
        kBacklogFull,    // a backlog of one that the listener fills itself; nothing is accepted for
                         // 5 s, after which waiting connections are closed, so that a sender that
                         // would wait for ever fails its test instead of hanging it
    };

    // Listens on the daemon socket path.
    explicit FrameListener(Mode mode = Mode::kReadAll);
    ~FrameListener();

    // The bytes of the first count connections, waiting up to five seconds for them.
    std::vector<std::string> Connections(size_t count);

    // The JSON text of a well-formed frame: checks the length prefix and the single trailing NUL.
    static std::string TextOfFrame(const std::string &frame);

private:
    void Run();
    bool WaitForStop(int milliseconds);

    const Mode m_mode;
    int m_listenFd;
    int m_fillerFd;
    int m_stopPipe[2];
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::vector<std::string> m_connections;
    std::thread m_thread;
};

}  // namespace fileindex_test

#endif
