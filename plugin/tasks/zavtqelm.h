/// One management request from the server, together with its outcome.
#pragma once

#include <memory>

#include "base/zavstr.h"
#include "tasks/request_row.h"

/// The request table fills the record. The task manager checks it, then runs or queues it. The
/// handlers read it and set its message. The record itself formats the rows that answer it. One
/// thread at a time.
class TaskQueueElem {
public:
    TaskQueueElem() = default;
    /// A request with these values, and no message yet.
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
    /// The message id of the result, and the message's one parameter.
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

    /// The row of the request table, as ReturnStatus() has filled it; all zeros before.
    zav_kagreqt_data_t getReturnResults() const { return row_ ? *row_ : zav_kagreqt_data_t{}; }
    /// Fills the row of the request table with the record's values and `rc`; sends nothing. Values
    /// that are too long for their columns are truncated and traced.
    void ReturnStatus(int rc);
    /// Publishes the outcome as one row of the deploy status table. Sleeps for a second first, to
    /// pace the events. Values that are too long are truncated and traced.
    void returnAsyncStatus(int rc);

    /// Copies a 0-terminated text into a field of `size` bytes, without its terminator. A shorter
    /// text is padded with blanks; a longer one is truncated and traced.
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
    // Null until it is filled, then immutable and shared by copies: a row is much larger than the
    // rest of the record, and tasks in the queue do not need one.
    std::shared_ptr<const zav_kagreqt_data_t> row_;
};
