/** The key under which this machine enciphers credentials. */
#ifndef ZOSPLATFORM_SRC_MACHINE_KEY_H
#define ZOSPLATFORM_SRC_MACHINE_KEY_H

#include <array>

namespace zos {

/** 32 bytes that are wiped when they go. */
class MachineKey {
  public:
    static constexpr int kSize = 32;

    MachineKey() = default;
    MachineKey(const MachineKey&) = delete;
    MachineKey& operator=(const MachineKey&) = delete;
    ~MachineKey();

    /**
     * Reads the key file; with `make` it is made if it is missing, which only root can. A file
     * that cannot be the key (a link, another size, another owner than root, writable or
     * readable for more than root and group) is refused and left alone.
     */
    bool Load(bool make);

    const unsigned char* Bytes() const { return bytes_.data(); }

  private:
    bool Read(int dir);
    bool Make(int dir);

    std::array<unsigned char, kSize> bytes_{};
};

}  // namespace zos

#endif
