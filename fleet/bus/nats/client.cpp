#include "fleet/bus/nats/client.h"

#include <climits>
#include <cstdlib>

#include "fleet/bus/nats/subject.h"

namespace fleet {

namespace {

using HeaderTexts = std::unique_ptr<const char*, decltype(&std::free)>;

bool isOneLine(const std::string& text) {
    return text.find_first_of("\r\n") == std::string::npos;
}

bool addHeaders(natsMsg* message, const BusHeaders& headers) {
    for (const auto& [key, value] : headers) {
        if (!isOneLine(key) || !isOneLine(value)) return false;
        if (natsMsgHeader_Add(message, key.c_str(), value.c_str()) != NATS_OK) return false;
    }
    return true;
}

void copyHeaders(natsMsg* message, BusHeaders& headers) {
    const char** keys = nullptr;
    int count = 0;
    if (natsMsgHeader_Keys(message, &keys, &count) != NATS_OK) return;
    const HeaderTexts ownedKeys(keys, &std::free);
    for (int i = 0; i < count; ++i) {
        const char** values = nullptr;
        int valueCount = 0;
        if (natsMsgHeader_Values(message, keys[i], &values, &valueCount) != NATS_OK) continue;
        const HeaderTexts ownedValues(values, &std::free);
        for (int j = 0; j < valueCount; ++j)
            headers.emplace_back(keys[i], values[j]);
    }
}

std::string textOrEmpty(const char* text) {
    return text == nullptr ? "" : text;
}

}  // namespace

BusStatus statusOf(natsStatus result, const std::string& what) {
    const std::string text = what + ": " + natsStatus_GetText(result);
    switch (result) {
        case NATS_OK:
            return {};
        case NATS_NOT_PERMITTED:
            return BusStatus::forbidden(text);
        case NATS_MAX_PAYLOAD:
        case NATS_INVALID_SUBJECT:
        case NATS_INVALID_ARG:
        case NATS_NO_SERVER_SUPPORT:
            return BusStatus::refused(0, text);
        default:
            return BusStatus::noAnswer(text);
    }
}

NatsMessage makeMessage(const std::string& subject, const std::string& reply,
                        std::string_view bytes, const BusHeaders& headers, BusStatus& status) {
    if (!isSubject(subject) || (!reply.empty() && !isSubject(reply))) {
        status = BusStatus::refused(0, "nothing can be published on such a subject");
        return nullptr;
    }
    if (bytes.size() > INT_MAX) {
        status = BusStatus::refused(0, "too long for the bus");
        return nullptr;
    }
    natsMsg* made = nullptr;
    const natsStatus result =
        natsMsg_Create(&made, subject.c_str(), reply.empty() ? nullptr : reply.c_str(),
                       bytes.data(), static_cast<int>(bytes.size()));
    NatsMessage message(made);
    if (result != NATS_OK) {
        status = statusOf(result, "the message cannot be made");
        return nullptr;
    }
    if (!addHeaders(message.get(), headers)) {
        status = BusStatus::refused(0, "a header cannot be sent");
        return nullptr;
    }
    return message;
}

BusMessage messageOf(natsMsg* message) {
    BusMessage copy;
    copy.subject = textOrEmpty(natsMsg_GetSubject(message));
    copy.reply = textOrEmpty(natsMsg_GetReply(message));
    copy.data.assign(natsMsg_GetData(message),
                     static_cast<std::size_t>(natsMsg_GetDataLength(message)));
    copyHeaders(message, copy.headers);
    return copy;
}

}  // namespace fleet
