// The examples of the manual pages, which tests/documents runs.
#ifndef TARNWICK_DOCS_MAN_EXAMPLES_EXAMPLES_H_
#define TARNWICK_DOCS_MAN_EXAMPLES_EXAMPLES_H_

#include <cstdint>
#include <string>

void ReportCamera(int camera, bool responds);
void NotifyUser(const char* text);

std::string QueryOf(const std::string& place);
std::string BasicLogin(const std::string& user, const std::string& password);
std::string SnapshotName(int camera, int64_t microseconds);

// The frames grabbed; -1 when the thread could not be started.
int GrabThreeFrames();
bool SendPicture(int fd, const std::string& picture);

// The number that the device sends; -1 when it sends none.
int CameraNumber(const std::string& host, int port);

// Empty when the device does not send the whole page.
std::string InfoPage(const std::string& host, int port);

// Empty when the device does not respond.
std::string Greeting(const std::string& host, int port, bool tls);

// The HTTP status; -1 when there was none.
long StatusOf(const std::string& url);

// Results: 0, or -1 with the file as it was.
int DoubleSetting(const char* path, const char* key);

// The result of SendHttpGet; what it logs of the device is escaped.
int AskDevice(const std::string& host, int port);

bool LibraryIsNewEnough();

#endif  // TARNWICK_DOCS_MAN_EXAMPLES_EXAMPLES_H_
