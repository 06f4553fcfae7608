#pragma once

// libzovadaemon.so.6: texts over a stream socket, each framed so that it arrives whole.

#include <string>

namespace zovadaemon {

/** One connection. Both ends send and receive whole texts in turn; every wait has a limit. */
class SockConnection {
public:
    /** Takes over the descriptor of a connected stream socket; below 0 for none. */
    explicit SockConnection(int descriptor = -1);
    SockConnection(const SockConnection&) = delete;
    SockConnection& operator=(const SockConnection&) = delete;
    /** Closes the socket if it is open. */
    virtual ~SockConnection();

    /** False if the text did not leave whole within the time limit; nothing more can be sent then. */
    bool Send(const std::string& text);
    /** False, with `text` left alone, if no whole text arrived within the time limit. */
    bool Recv(std::string& text);
    /** Closes the socket if it is open. */
    void Close();

protected:
    int fd;
};

/** A connection to the service that listens at a path. */
class DomainSockConnection : public SockConnection {
public:
    explicit DomainSockConnection(const std::string& path);
    ~DomainSockConnection() override;

    /** False, with errno, if nobody takes the connection within the time limit. */
    bool Connect();

private:
    std::string path;
};

}  // namespace zovadaemon
