#include "platform/linux/logs/journal.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cstring>

#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

// Listens as the journal does: datagrams, and files in memory that come with one.
class ListeningJournal {
 public:
  ListeningJournal() {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.native().copy(static_cast<char*>(address.sun_path), sizeof address.sun_path - 1);
    if (::bind(_socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0)
      throw std::runtime_error{"bind"};
  }
  ListeningJournal(const ListeningJournal&) = delete;
  ListeningJournal& operator=(const ListeningJournal&) = delete;
  ~ListeningJournal() {
    if (file >= 0) ::close(file);
    ::close(_socket);
  }

  // The next datagram; the file that came with it is in `file`.
  std::string next() {
    std::string text(4096, '\0');
    iovec room{text.data(), text.size()};
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
    msghdr message{};
    message.msg_iov = &room;
    message.msg_iovlen = 1;
    message.msg_control = control.data();
    message.msg_controllen = control.size();
    const ssize_t size = ::recvmsg(_socket, &message, MSG_DONTWAIT);
    if (const cmsghdr* const header = CMSG_FIRSTHDR(&message)) std::memcpy(&file, CMSG_DATA(header), sizeof file);
    return size < 0 ? "nothing" : text.substr(0, static_cast<std::size_t>(size));
  }

  ScratchDirectory directory;
  std::filesystem::path path = directory.path() / "socket";
  int file = -1;

 private:
  int _socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
};

std::string identifierLine() { return std::string{"SYSLOG_IDENTIFIER="} + ::program_invocation_short_name + "\n"; }

TEST(Journal, TakesAFieldALineAndTheProgramsName) {
  ListeningJournal journal;
  platform::sendToJournal(journal.path, {"MESSAGE=Saving all accounts", "PRIORITY=5"});
  EXPECT_EQ("MESSAGE=Saving all accounts\nPRIORITY=5\n" + identifierLine(), journal.next());
}

TEST(Journal, TakesAValueOfSeveralLinesAfterItsSize) {
  ListeningJournal journal;
  platform::sendToJournal(journal.path, {"MESSAGE=Two\nlines"});
  const std::string size{"\x09\0\0\0\0\0\0\0", 8};
  EXPECT_EQ("MESSAGE\n" + size + "Two\nlines\n" + identifierLine(), journal.next());
}

TEST(Journal, TakesWhatNoDatagramCarriesAsASealedFile) {
  ListeningJournal journal;
  const std::string large(std::size_t{32} << 20U, 'x');
  platform::sendToJournal(journal.path, {"MESSAGE=" + large});
  EXPECT_EQ("", journal.next());
  ASSERT_GE(journal.file, 0);
  EXPECT_EQ(F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL, ::fcntl(journal.file, F_GET_SEALS));
  std::string contents(large.size() + 100, '\0');
  contents.resize(static_cast<std::size_t>(::pread(journal.file, contents.data(), contents.size(), 0)));
  EXPECT_EQ("MESSAGE=" + large + "\n" + identifierLine(), contents);
}

TEST(Journal, ThatIsNotThereLosesTheRecord) {
  const ScratchDirectory directory;
  EXPECT_NO_THROW(platform::sendToJournal(directory.path() / "none", {"MESSAGE=lost"}));
}

}  // namespace
}  // namespace tests
