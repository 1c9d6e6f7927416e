// The hand-off's baseline: connects to 127.0.0.1:6152 and sends each argument with one send, as
// the launcher's second instance does, then closes. No log, lock or display.
#include <arpa/inet.h>
#include <netinet/in.h>
#include <string.h>
#include <sys/socket.h>
#include <unistd.h>

int main(int argc, char** argv) {
    struct sockaddr_in to;
    memset(&to, 0, sizeof to);
    to.sin_family = AF_INET;
    to.sin_port = htons(6152);
    to.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    int s = socket(AF_INET, SOCK_STREAM, 0);
    if (s < 0 || connect(s, (struct sockaddr*)&to, sizeof to) != 0) return 1;
    for (int i = 1; i < argc; ++i) send(s, argv[i], strlen(argv[i]), MSG_NOSIGNAL);
    close(s);
    return 0;
}
