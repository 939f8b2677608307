/// A table made up for checks: readings with a name, a value and a remark.
#pragma once

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "platform/oxa.h"

struct SampleRow {
    char name[8];
    std::int32_t value;
    char remark[5];
    char filler[3];
};

inline SampleRow sampleRow(const std::string& name, int value, const std::string& remark = "") {
    SampleRow row{};
    std::memset(row.name, ' ', sizeof row.name);
    std::memset(row.remark, ' ', sizeof row.remark);
    std::memcpy(row.name, name.data(), std::min(name.size(), sizeof row.name));
    std::memcpy(row.remark, remark.data(), std::min(remark.size(), sizeof row.remark));
    row.value = value;
    return row;
}

class SampleManager;

class SampleRequest : public rtoxa {
public:
    SampleRequest(RequestDetail* detail, ContextInfo* context, SampleManager* manager);
    ~SampleRequest() override;

    int TakeSample() override;
    int NumColumns() override { return 3; }
    int GetColumnInfo(ColumnInfo* info, int index) override {
        static constexpr ColumnInfo kColumns[] = {
            {"name", 0, 8, OXA_TYPE_CHARACTER},
            {"value", 8, 4, OXA_TYPE_INTEGER},
            {"remark", 12, 5, OXA_TYPE_CHARACTER},
        };
        if (index < 0 || index > 3) return OXA_BAD_COLUMN;
        if (index < 3) *info = kColumns[index];
        return OXA_OK;
    }
    int ColumnIsException(char* column, char* row, _IntfOper op, char* value) override {
        ++comparisons;
        const SampleRow& at = *reinterpret_cast<SampleRow*>(row);
        if (std::strcmp(column, "NAME") == 0) return IsException(op, at.name, value, 8);
        if (std::strcmp(column, "VALUE") == 0) return IsException(op, at.value, value);
        if (std::strcmp(column, "REMARK") == 0) return IsException(op, at.remark, value, 5);
        return 0;
    }
    int add(const SampleRow& row) {
        SampleRow copy = row;
        char* const bytes = reinterpret_cast<char*>(&copy);
        return CheckForException(bytes) != 0 ? InsertRow(bytes) : OXA_OK;
    }
    using rtoxa::IsException;

    int comparisons = 0;

private:
    SampleManager& manager_;
};

class SampleManager : public TableManager {
public:
    explicit SampleManager(const char* table = "SAMPLE") : TableManager("TST", table) {}
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override {
        if (onCreate) onCreate();
        return new SampleRequest(detail, context, this);
    }
    void Shutdown(unsigned long) override { ++shutdowns; }

    /// Hands one row to every live object. Returns the last status that was not 0.
    int publish(const SampleRow& row) {
        int result = 0;
        lock();
        RtoxaListIter live(this);
        while (rtoxa* const object = live.Next()) {
            SampleRequest& request = *static_cast<SampleRequest*>(object);
            request.UseHandle(request.Handle());
            request.add(row);
            const int status = request.Dispatch();
            if (status != 0) result = status;
            request.ClearCount();
            request.Drop();
        }
        unlock();
        return result;
    }
    std::vector<unsigned> liveNumbers() {
        std::vector<unsigned> numbers;
        lock();
        RtoxaListIter live(this);
        while (const rtoxa* const object = live.Next())
            numbers.push_back(object->ObjectNumber());
        unlock();
        return numbers;
    }

    std::vector<SampleRow> sample;  ///< what a plain query finds
    std::function<void()> onCreate, onSample;
    std::atomic<int> objects{0}, samples{0}, shutdowns{0};
};

inline SampleRequest::SampleRequest(RequestDetail* detail, ContextInfo* context,
                                    SampleManager* manager)
    : rtoxa(detail, context, manager), manager_(*manager) {
    SetRowSize(sizeof(SampleRow));
    SetAllocationDefault(1);
    ++manager_.objects;
}

inline SampleRequest::~SampleRequest() {
    --manager_.objects;
}

inline int SampleRequest::TakeSample() {
    ++manager_.samples;
    if (manager_.onSample) manager_.onSample();
    int status = OXA_OK;
    for (const SampleRow& row : manager_.sample)
        status = add(row);
    return status;
}
