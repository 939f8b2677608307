// What oxa.h promises of requests: filters, rows, uses and dispatch.

#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "conformance/rule.h"
#include "conformance/sample_requests.h"
#include "conformance/sample_table.h"

namespace conformance {
namespace {

/// A request made outside any framework, for operations that need none.
struct LooseRequest {
    SampleManager manager;
    SampleRequest request{nullptr, nullptr, &manager};
};

/// A table's class that overrides nothing it need not.
class BareRequest : public rtoxa {
public:
    using rtoxa::rtoxa;
    int TakeSample() override { return OXA_OK; }
};

struct LooseBareRequest {
    SampleManager manager;
    BareRequest request{nullptr, nullptr, &manager};
};

char* bytesOf(SampleRow& row) {
    return reinterpret_cast<char*>(&row);
}

void requireRow(const rtoxa& request, int index, const SampleRow& expected) {
    require(std::memcmp(request.Data(index), &expected, sizeof expected) == 0,
            "row " + std::to_string(index) + " has other bytes");
}

// --- The base class ---------------------------------------------------------------------------

void startsEmpty(Bench&) {
    LooseRequest loose;
    FLT1_FILTERINFO entry{};
    requireEqual(loose.request.GetFilterInfo(&entry), int{OXA_END_OF_FILTER}, "GetFilterInfo()");
    requireEqual(loose.request.NumDataItems(), 0, "NumDataItems()");
    requireEqual(loose.request.SampleType(), 0, "SampleType()");
}

void printsItself(Bench& bench) {
    LooseBareRequest loose;
    const auto trace = bench.driver().captureTrace(Selection::Everything);
    loose.request.PrintSelf();
    require(!trace->lines().empty(), "traced nothing");
}

void knowsNoColumn(Bench&) {
    requireEqual(LooseBareRequest().request.NumColumns(), 0, "the number");
}

void leavesTheColumnAlone(Bench&) {
    LooseBareRequest loose;
    ColumnInfo info{"untouched", 1, 2, 3};
    requireEqual(loose.request.GetColumnInfo(&info, 0), int{OXA_BAD_COLUMN}, "the result");
    requireEqual(info.name, std::string("untouched"), "the name");
}

void hasNoCommand(Bench&) {
    char text[] = "x";
    requireEqual(LooseBareRequest().request.ExecuteCommand(text, 1, text), int{OXA_FAILED},
                 "the result");
}

void comparesNoColumn(Bench&) {
    char text[] = "x";
    requireEqual(LooseBareRequest().request.ColumnIsException(text, text, OPER_EQ, text), 0,
                 "the result");
}

void takesNoCapsule(Bench&) {
    LooseBareRequest().request.CommandCompleted(nullptr);
}

// --- Rows -------------------------------------------------------------------------------------

void keepsCopiesInOrder(Bench&) {
    LooseRequest loose;
    for (int i = 0; i < 10; ++i) {
        SampleRow row = sampleRow("r" + std::to_string(i), i);
        requireEqual(loose.request.InsertRow(bytesOf(row)), int{OXA_OK}, "the result");
    }
    requireEqual(loose.request.NumDataItems(), 10, "the number of rows");
    for (int i = 0; i < 10; ++i)
        requireRow(loose.request, i, sampleRow("r" + std::to_string(i), i));
}

void saysWhenMemoryIsShort(Bench&) {
    LooseRequest loose;
    loose.request.SetRowSize(0x7FFFFFFF);
    loose.request.SetAllocationDefault(0xFFFFFFFF);
    SampleRow row = sampleRow("a", 1);
    requireEqual(loose.request.InsertRow(bytesOf(row)), int{OXA_NO_MEMORY}, "the result");
    requireEqual(loose.request.NumDataItems(), 0, "the number of rows");
}

void needsTheRowsSize(Bench&) {
    LooseRequest loose;
    loose.request.SetRowSize(0);
    SampleRow row = sampleRow("a", 1);
    require(loose.request.InsertRow(bytesOf(row)) != OXA_OK, "took a row of unknown size");
}

void makesRoomAsAsked(Bench&) {
    LooseRequest loose;
    loose.request.SetAllocationDefault(16);
    requireEqual(loose.request.AllocationDefault(), 16U, "AllocationDefault()");
    loose.request.add(sampleRow("a", 1));
    require(loose.request.NumRowsAllocated() >= 16, "made room for fewer rows");
}

void countsRows(Bench&) {
    LooseRequest loose;
    requireEqual(loose.request.NumDataItems(), 0, "the number before the first row");
    loose.request.add(sampleRow("a", 1));
    loose.request.add(sampleRow("b", 2));
    requireEqual(loose.request.NumDataItems(), 2, "the number after two");
}

void hasRoomForItsRows(Bench&) {
    LooseRequest loose;
    for (int i = 0; i < 100; ++i) {
        loose.request.add(sampleRow("a", i));
        require(loose.request.NumRowsAllocated() >= loose.request.NumDataItems(),
                "has room for fewer rows than it holds");
    }
}

void givesTheRowsBytes(Bench&) {
    LooseRequest loose;
    loose.request.add(sampleRow("a", 1));
    loose.request.add(sampleRow("b", 2, "two"));
    requireRow(loose.request, 1, sampleRow("b", 2, "two"));
}

void keepsMemoryWhenCleared(Bench&) {
    LooseRequest loose;
    loose.request.add(sampleRow("a", 1));
    loose.request.add(sampleRow("b", 2));
    const int allocated = loose.request.NumRowsAllocated();
    loose.request.ClearCount();
    requireEqual(loose.request.NumDataItems(), 0, "the number of rows");
    requireEqual(loose.request.NumRowsAllocated(), allocated, "the number of rows with room");
    loose.request.add(sampleRow("c", 3));
    requireRow(loose.request, 0, sampleRow("c", 3));
}

// --- Filters ----------------------------------------------------------------------------------

using Names = std::vector<std::string>;

Names ask(Bench& bench, const Conditions& where, std::vector<SampleRow> rows = {}) {
    SampleManager manager;
    manager.sample = std::move(rows);
    if (manager.sample.empty()) {
        manager.sample = {sampleRow("alpha", 1, "one"), sampleRow("beta", 2, "two"),
                          sampleRow("gamma", 3, "three")};
    }
    requireEqual(manager.RegisterWithManager(), int{OXA_OK}, "the result of the registration");
    const Answer answer = bench.driver().query("SAMPLE", where);
    requireEqual(answer.status, int{OXA_OK}, "the query's status");
    return namesOf(answer.rows);
}

void passesEveryRowWithoutAFilter(Bench&) {
    LooseRequest loose;
    SampleRow row = sampleRow("a", 1);
    requireEqual(loose.request.CheckForException(bytesOf(row)), 1, "the result");
}

void combinesWithAnd(Bench& bench) {
    requireEqual(ask(bench, {{"VALUE", OPER_GE, "2"}}), Names{"beta", "gamma"}, "VALUE >= 2");
    requireEqual(ask(bench, {{"VALUE", OPER_GE, "2"}, {"NAME", OPER_NE, "beta"}}), Names{"gamma"},
                 "VALUE >= 2 and NAME != beta");
    requireEqual(ask(bench, {{"NAME", OPER_EQ, "alpha"}, {"NAME", OPER_EQ, "beta"}}), Names{},
                 "two different names");
    requireEqual(ask(bench, {{"REMARK", OPER_LIKE, "t*"}}), Names{"beta", "gamma"},
                 "REMARK like t*");
}

void ignoresUnknownColumns(Bench& bench) {
    const Names all = {"alpha", "beta", "gamma"};
    requireEqual(ask(bench, {{"name", OPER_EQ, "alpha"}}), all, "a name in lower case");
    requireEqual(ask(bench, {{"NAMES", OPER_EQ, "alpha"}}), all, "a name that does not exist");
    requireEqual(ask(bench, {{"", OPER_EQ, ""}, {"NAME", OPER_EQ, "beta"}}), Names{"beta"},
                 "an empty name beside a good one");
}

void comparesUpToTheColumnsWidth(Bench& bench) {
    requireEqual(ask(bench, {{"NAME", OPER_EQ, "abcdefghijkl"}}, {sampleRow("abcdefghijkl", 1)}),
                 Names{"abcdefgh"}, "a value wider than its column");
}

/// Reads its filter in its constructor's wake, as tables do.
class FilterReader : public SampleManager {
public:
    FilterReader() : SampleManager("FILTER") {}
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override {
        auto request = std::make_unique<SampleRequest>(detail, context, this);
        FLT1_FILTERINFO entry{};
        for (status = request->GetFilterInfo(&entry); status == OXA_OK;
             status = request->GetFilterInfo(&entry)) {
            seen.push_back({entry.columnName, entry.op, {entry.value, entry.valueLength}});
            terminated = terminated && entry.value[entry.valueLength] == '\0';
        }
        return request.release();
    }
    Conditions seen;
    bool terminated = true;
    int status = OXA_OK;
};

void handsOutTheFilterUnchanged(Bench& bench) {
    FilterReader manager;
    manager.RegisterWithManager();
    const Conditions where = {{"NAME", OPER_EQ, "  x  "},
                              {"no such", OPER_LIKE, "*"},
                              {"NAME", OPER_NE, std::string("a\0b ", 4)}};
    bench.driver().query("FILTER", where);
    requireEqual(manager.seen.size(), where.size(), "the number of entries");
    for (std::size_t i = 0; i < where.size(); ++i) {
        requireEqual(manager.seen[i].column, where[i].column, "a column");
        requireEqual(int{manager.seen[i].op}, int{where[i].op}, "an operator");
        requireEqual(manager.seen[i].value, where[i].value, "a value");
    }
    require(manager.terminated, "there is no 0 behind a value");
    requireEqual(manager.status, int{OXA_END_OF_FILTER}, "the status at the end");
}

// --- What a request says of itself ------------------------------------------------------------

void namesItsApplication(Bench&) {
    requireEqual(LooseRequest().request.ApplicationName(), std::string("TST"), "the name");
}

void namesItsTable(Bench&) {
    requireEqual(LooseRequest().request.TableName(), std::string("SAMPLE"), "the name");
}

void hasItsOwnNumber(Bench&) {
    LooseRequest loose;
    const SampleRequest other(nullptr, nullptr, &loose.manager);
    require(other.ObjectNumber() != loose.request.ObjectNumber(), "two objects have one number");
}

void hasItsOwnHandle(Bench&) {
    LooseRequest loose;
    const SampleRequest other(nullptr, nullptr, &loose.manager);
    require(loose.request.Handle() != 0 && other.Handle() != 0, "a handle is 0");
    require(other.Handle() != loose.request.Handle(), "two objects have one handle");
}

void hasNoInterval(Bench&) {
    requireEqual(LooseRequest().request.Interval(), 0, "the number");
}

void saysWhetherItIsLive(Bench& bench) {
    LiveRequest live(bench);
    requireEqual(LooseRequest().request.SampleType(), 0, "a plain query's");
    requireEqual(live.object().SampleType(), 1, "a subscription's");
}

// --- Uses and dispatch ------------------------------------------------------------------------

void countsUsesOfItsOwnHandle(Bench&) {
    LooseRequest loose;
    rtoxa& request = loose.request;
    requireEqual(request.UseCount(), 0U, "the count at first");
    request.UseHandle(request.Handle());
    request.UseHandle(request.Handle());
    request.UseHandle(request.Handle() + 1);
    requireEqual(request.UseCount(), 2U, "the count");
}

void endsUses(Bench&) {
    LooseRequest loose;
    rtoxa& request = loose.request;
    request.UseHandle(request.Handle());
    request.Drop();
    request.Drop();  // without a use it does nothing
    requireEqual(request.UseCount(), 0U, "the count");
}

void keepsAnObjectInUse(Bench& bench) {
    LiveRequest live(bench);
    SampleRequest& object = live.object();
    object.UseHandle(object.Handle());
    object.UseHandle(object.Handle());
    live.end();
    requireEqual(live.manager.objects.load(), 1, "the number of objects in use");
    object.Drop();
    requireEqual(live.manager.objects.load(), 1, "the number of objects before the last drop");
    object.Drop();
    requireEqual(live.manager.objects.load(), 0, "the number of objects after the last drop");
}

void keepsThePlainQuerysRows(Bench&) {
    LooseRequest loose;
    loose.request.add(sampleRow("a", 1));
    requireEqual(loose.request.Dispatch(), int{OXA_OK}, "the result");
    requireEqual(loose.request.NumDataItems(), 1, "the number of rows");
}

void handsRowsOver(Bench& bench) {
    LiveRequest all(bench);
    requireEqual(all.manager.publish(sampleRow("x", 1)), int{OXA_OK}, "the result");
    requireEqual(all.manager.publish(sampleRow("y", 2)), int{OXA_OK}, "the result");
    requireEqual(all.names(), Names{"x", "y"}, "the requester's rows");
}

void leavesTheRequesterAloneWithoutRows(Bench& bench) {
    LiveRequest live(bench, {{"NAME", OPER_EQ, "x"}});
    requireEqual(live.manager.publish(sampleRow("y", 1)), int{OXA_OK}, "the result");
    requireEqual(live.calls(), 0, "the number of calls");
    requireEqual(live.manager.publish(sampleRow("x", 1)), int{OXA_OK}, "the result");
    requireEqual(live.names(), Names{"x"}, "the requester's rows");
}

void passesTheRequestersAnswerOn(Bench& bench) {
    LiveRequest live(bench);
    for (const int answer : {int{OXA_OVERFLOW}, int{OXA_GONE}, int{OXA_OK}}) {
        live.answer = answer;
        requireEqual(live.manager.publish(sampleRow("a", 1)), answer, "the result");
    }
}

void saysWhenTheRequesterIsGone(Bench& bench) {
    LiveRequest live(bench);
    SampleRequest& object = live.object();
    object.UseHandle(object.Handle());
    live.end();
    object.add(sampleRow("a", 1));
    requireEqual(object.Dispatch(), int{OXA_GONE}, "the result");
    requireEqual(live.calls(), 0, "the number of calls");
    object.Drop();
}

}  // namespace

std::vector<Operation> oxaRequestOperations() {
    return {
        {"rtoxa::rtoxa", {{"begins without rows, filter and subscription", startsEmpty}}},
        {"rtoxa::PrintSelf", {{"traces the object", printsItself}}},
        {"rtoxa::NumColumns", {{"is 0 in the base class", knowsNoColumn}}},
        {"rtoxa::GetColumnInfo", {{"knows no column in the base class", leavesTheColumnAlone}}},
        {"rtoxa::ExecuteCommand", {{"knows no command in the base class", hasNoCommand}}},
        {"rtoxa::InsertRow",
         {{"keeps copies in order", keepsCopiesInOrder},
          {"says when memory is short", saysWhenMemoryIsShort}}},
        {"rtoxa::CheckForException",
         {{"passes every row without a filter", passesEveryRowWithoutAFilter},
          {"combines conditions with AND", combinesWithAnd},
          {"ignores conditions on unknown columns", ignoresUnknownColumns},
          {"compares up to the column's width", comparesUpToTheColumnsWidth}}},
        {"rtoxa::ColumnIsException", {{"is 0 in the base class", comparesNoColumn}}},
        {"rtoxa::CommandCompleted", {{"takes a null capsule", takesNoCapsule}}},
        {"rtoxa::GetFilterInfo",
         {{"hands the filter out in order and unchanged", handsOutTheFilterUnchanged}}},
        {"rtoxa::SetRowSize", {{"comes before the first row", needsTheRowsSize}}},
        {"rtoxa::SetAllocationDefault", {{"makes room for so many rows", makesRoomAsAsked}}},
        {"rtoxa::NumDataItems", {{"counts the rows", countsRows}}},
        {"rtoxa::NumRowsAllocated", {{"covers the rows", hasRoomForItsRows}}},
        {"rtoxa::Data", {{"gives a row's bytes", givesTheRowsBytes}}},
        {"rtoxa::ClearCount", {{"forgets rows and keeps their memory", keepsMemoryWhenCleared}}},
        {"rtoxa::ApplicationName", {{"is the manager's", namesItsApplication}}},
        {"rtoxa::TableName", {{"is the manager's", namesItsTable}}},
        {"rtoxa::Interval", {{"is 0 for a plain query", hasNoInterval}}},
        {"rtoxa::SampleType", {{"tells subscriptions from plain queries", saysWhetherItIsLive}}},
        {"rtoxa::ObjectNumber", {{"is each object's own", hasItsOwnNumber}}},
        {"rtoxa::Handle", {{"is each object's own and never 0", hasItsOwnHandle}}},
        {"rtoxa::UseHandle",
         {{"counts uses of its own handle only", countsUsesOfItsOwnHandle},
          {"keeps an object whose subscription ends", keepsAnObjectInUse}}},
        {"rtoxa::Drop", {{"ends a use, and without one does nothing", endsUses}}},
        {"rtoxa::Dispatch",
         {{"leaves the rows of a plain query", keepsThePlainQuerysRows},
          {"hands rows to the requester", handsRowsOver},
          {"leaves the requester alone without rows", leavesTheRequesterAloneWithoutRows},
          {"returns what the requester answers", passesTheRequestersAnswerOn},
          {"says when the requester is gone", saysWhenTheRequesterIsGone}}},
    };
}

}  // namespace conformance
