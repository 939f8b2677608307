/// A client that pushes one file into the depot, packet by packet.
#pragma once

#include <cstdint>

#include "soak/load/client.h"

namespace soak {

class Pusher final : public Client {
public:
    explicit Pusher(World& world);

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    enum class Stage { Binding, Sending };

    bool takePackets();
    bool onBound(const std::string& packet);
    bool onAnswer(const std::string& packet);
    void sendBatch();
    bool complete();
    std::string expected() const;

    std::string name_;  ///< as the host is told
    std::string content_;
    bool converted_ = false;
    std::size_t at_ = 0;    ///< bytes of the content that are under way or written
    std::size_t gone_ = 0;  ///< bytes after which the client vanishes; 0: it does not
    std::uint32_t call_ = 1;
    Stage stage_ = Stage::Binding;
    std::uint16_t largestFragment_ = 0;
    double waitsUntil_ = 0;
};

}  // namespace soak
