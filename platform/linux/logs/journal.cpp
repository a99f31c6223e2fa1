#include "platform/linux/logs/journal.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>

#include "platform/kept_for_life.h"
#include "platform/linux/files/descriptor.h"
#include "platform/linux/files/file_access.h"

namespace platform {
namespace {

// A value of several lines is led by its size, 64 bits with the lowest byte first.
void addField(std::string& datagram, const std::string& field) {
  const std::size_t end = field.find('=');
  if (end == std::string::npos) return;
  if (field.find('\n') == std::string::npos) {
    datagram += field + "\n";
    return;
  }
  datagram.append(field, 0, end) += '\n';
  const std::uint64_t size = field.size() - end - 1;
  for (unsigned shift = 0; shift < 64; shift += 8) datagram += static_cast<char>((size >> shift) & 0xFFU);
  datagram.append(field, end + 1) += '\n';
}

// A file in memory that nobody can change any more: the journal takes no other.
Descriptor sealedFile(const std::string& contents) {
  constexpr int kSeals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL;
  Descriptor file{::memfd_create("journal-record", MFD_CLOEXEC | MFD_ALLOW_SEALING)};
  const bool isReady = file.isOpen() && writeAll(file.number(), contents.data(), contents.size()) &&
                       ::fcntl(file.number(), F_ADD_SEALS, kSeals) == 0;
  return isReady ? std::move(file) : Descriptor{};
}

bool send(const Descriptor& from, const msghdr& message) {
  return retried([&] { return ::sendmsg(from.number(), &message, MSG_NOSIGNAL); }) >= 0;
}

void sendFile(const Descriptor& from, msghdr message, const Descriptor& file) {
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
  message.msg_iov = nullptr;
  message.msg_iovlen = 0;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  cmsghdr* const header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof(int));
  const int number = file.number();
  std::memcpy(CMSG_DATA(header), &number, sizeof number);
  send(from, message);
}

const Descriptor& ownSocket() {
  static const Descriptor& socket = keptForLife<Descriptor>(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  return socket;
}

}  // namespace

void sendToJournal(const std::filesystem::path& socket, const std::vector<std::string>& fields) {
  std::string datagram;
  for (const std::string& field : fields) addField(datagram, field);
  addField(datagram, std::string{"SYSLOG_IDENTIFIER="} + ::program_invocation_short_name);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  const std::string& name = socket.native();
  if (!ownSocket().isOpen() || name.size() >= sizeof address.sun_path) return;
  name.copy(static_cast<char*>(address.sun_path), name.size());
  iovec text{datagram.data(), datagram.size()};
  msghdr message{};
  message.msg_name = &address;
  message.msg_namelen = sizeof address;
  message.msg_iov = &text;
  message.msg_iovlen = 1;
  if (send(ownSocket(), message) || (errno != EMSGSIZE && errno != ENOBUFS)) return;
  if (const Descriptor file = sealedFile(datagram); file.isOpen()) sendFile(ownSocket(), message, file);
}

}  // namespace platform
