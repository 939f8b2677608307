/// One management request of the server together with its outcome.
#pragma once

#include <memory>

#include "base/zavstr.h"
#include "tasks/request_row.h"

/// The request table fills the record, the task manager checks, runs or queues it, the handlers
/// read it and set its message, and the record itself formats the rows that answer it. A record
/// is used by one thread at a time.
class TaskQueueElem {
public:
    TaskQueueElem() = default;
    /// A request with these values and no message yet.
    TaskQueueElem(const ZAV::String& originnode, const ZAV::String& transid,
                  const ZAV::String& command, const ZAV::String& product,
                  const ZAV::String& context, const ZAV::String& optional,
                  const ZAV::String& uaconfig, const ZAV::String& uascript,
                  const ZAV::String& version, const ZAV::String& targetmsn);
    TaskQueueElem(const TaskQueueElem&) = default;
    TaskQueueElem(TaskQueueElem&&) = default;
    TaskQueueElem& operator=(const TaskQueueElem&) = default;
    TaskQueueElem& operator=(TaskQueueElem&&) noexcept = default;
    ~TaskQueueElem() = default;

    void setOriginnode(ZAV::String value) { originnode_ = std::move(value); }
    void setTransid(ZAV::String value) { transid_ = std::move(value); }
    void setCommand(ZAV::String value) { command_ = std::move(value); }
    void setProduct(ZAV::String value) { product_ = std::move(value); }
    void setContext(ZAV::String value) { context_ = std::move(value); }
    void setOptional(ZAV::String value) { optional_ = std::move(value); }
    void setUaconfig(ZAV::String value) { uaconfig_ = std::move(value); }
    void setUascript(ZAV::String value) { uascript_ = std::move(value); }
    void setVersion(ZAV::String value) { version_ = std::move(value); }
    void setTargetmsn(ZAV::String value) { targetmsn_ = std::move(value); }
    /// The identifier of the result's message, and the message's one parameter.
    void setRetmsgid(ZAV::String value) { retmsgid_ = std::move(value); }
    void setRetmsgparm(ZAV::String value) { retmsgparm_ = std::move(value); }

    ZAV::String getTransid() const { return transid_; }
    ZAV::String getCommand() const { return command_; }
    ZAV::String getProduct() const { return product_; }
    ZAV::String getContext() const { return context_; }
    ZAV::String getOptional() const { return optional_; }
    ZAV::String getUaconfig() const { return uaconfig_; }
    ZAV::String getUascript() const { return uascript_; }
    ZAV::String getVersion() const { return version_; }
    ZAV::String getTargetmsn() const { return targetmsn_; }

    /// The request table's row as ReturnStatus() has filled it; all 0 before.
    zav_kagreqt_data_t getReturnResults() const { return row_ ? *row_ : zav_kagreqt_data_t{}; }
    /// Fills the request table's row with the record's values and `rc`; sends nothing. Values that
    /// are too long for their columns are cut and traced.
    void ReturnStatus(int rc);
    /// Publishes the record's outcome as one row of the deploy status table. Sleeps one second
    /// first, which paces the events. Values that are too long are cut and traced.
    void returnAsyncStatus(int rc);

    /// Writes a 0-terminated text into a field of `size` bytes: padded with blanks, or cut and
    /// traced; no terminator.
    static void SetValueAndPad(char* field, unsigned size, const char* value);

private:
    ZAV::String originnode_;
    ZAV::String transid_;
    ZAV::String command_;
    ZAV::String product_;
    ZAV::String context_;
    ZAV::String optional_;
    ZAV::String uaconfig_;
    ZAV::String uascript_;
    ZAV::String version_;
    ZAV::String targetmsn_;
    ZAV::String retmsgid_;
    ZAV::String retmsgparm_;
    // Shared by copies, never changed, and null until it is filled: a row takes far more room than
    // all the rest, and a task that waits in the queue has none.
    std::shared_ptr<const zav_kagreqt_data_t> row_;
};
