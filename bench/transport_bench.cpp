// Round trips to the time-service simulator, each beside a plain libcurl easy-handle loop on the
// same URLs: one GET through the transport (loaded HTTP library, envelope check, unwrapping), and
// an Int32 attribute read through the C interface (two requests: the type, then the value), and
// the names of a service with a hundred thousand time references (one request of about 1.2 MB).
// Each side sends all its requests over one kept-alive connection; a benchmark whose requests the
// simulator saw on any other number of connections reports an error instead of a time.
#include <benchmark/benchmark.h>
#include <cjson/cJSON.h>
#include <curl/curl.h>

#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include <tiktal/tiktal.h>

#include "client/curl.h"
#include "timeservice_sim.h"

namespace {

std::unique_ptr<TimeServiceSim> gSim;
constexpr char kPath[] = "sync_1?attribute=epochOffsetInNsec";

// Runs `loop` with the simulator's counters cleared first, then checks that all its service
// requests went over one connection and shows the count beside the time.
template <typename Loop>
void onOneConnection(benchmark::State& state, Loop loop) {
    gSim->reset();
    loop();
    const long connections = gSim->connections();
    state.counters["connections"] = static_cast<double>(connections);
    if (connections != 1) state.SkipWithError(("opened " + std::to_string(connections) + " connections, not 1").c_str());
}

void TransportGet(benchmark::State& state) {
    zr::vantle::shared::tCURL curl;
    curl.initialize("http://" + gSim->host(), "tiktalwebs", 5000);
    curl.setMediaType("vnd.zr.tiktal.v1/json; charset=utf-8");
    onOneConnection(state, [&] {
        for (auto _ : state) benchmark::DoNotOptimize(curl.get(kPath));
    });
}

size_t collect(char* data, size_t size, size_t count, void* user) {
    static_cast<std::string*>(user)->append(data, size * count);
    return size * count;
}

// GETs of `paths` (under /tiktalwebs/) in turn on one easy handle, so on one kept-alive
// connection, each iteration all of them.
void plainGets(benchmark::State& state, const std::vector<std::string>& paths) {
    CURL* handle = curl_easy_init();
    curl_slist* headers = curl_slist_append(nullptr, "Accept: vnd.zr.tiktal.v1/json; charset=utf-8");
    headers = curl_slist_append(headers, "Content-Type: vnd.zr.tiktal.v1/json; charset=utf-8");
    std::string body;
    curl_easy_setopt(handle, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, collect);
    curl_easy_setopt(handle, CURLOPT_WRITEDATA, &body);
    curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
    std::vector<std::string> urls;
    for (const std::string& path : paths) urls.push_back(gSim->url("/tiktalwebs/" + path));
    onOneConnection(state, [&] {
        for (auto _ : state) {
            for (const std::string& url : urls) {
                curl_easy_setopt(handle, CURLOPT_URL, url.c_str());
                body.clear();
                curl_easy_perform(handle);
                benchmark::DoNotOptimize(body);
            }
        }
    });
    curl_slist_free_all(headers);
    curl_easy_cleanup(handle);
}

void PlainLibcurlGet(benchmark::State& state) { plainGets(state, {kPath}); }

void SessionGetAttributeViInt32(benchmark::State& state) {
    ViSession vi = 0;
    if (tiktal_init(gSim->resource().c_str(), VI_FALSE, VI_FALSE, &vi) != VI_SUCCESS) {
        state.SkipWithError("tiktal_init failed");
        return;
    }
    ViInt32 value = 0;
    onOneConnection(state, [&] {
        for (auto _ : state)
            benchmark::DoNotOptimize(tiktal_GetAttributeViInt32(vi, "PTP1", TIKTAL_ATTR_1588_PRIORITY1, &value));
    });
    tiktal_close(vi);
}

// The same two requests as SessionGetAttributeViInt32 sends, on one kept-alive connection.
void PlainLibcurlTypeThenValue(benchmark::State& state) { plainGets(state, {"sync_1/PTP1/type", "sync_1/PTP1/priority1"}); }

// A service with kManyReferences time references while `body` runs; the state is restored after.
constexpr int kManyReferences = 100000;
template <typename Body>
void withManyReferences(Body body) {
    const std::string saved = gSim->state();
    cJSON* many = cJSON_Parse(saved.c_str());
    cJSON* references = cJSON_CreateObject();
    for (int i = 0; i < kManyReferences; ++i)
        cJSON_AddItemToObject(cJSON_AddObjectToObject(references, ("TR" + std::to_string(i)).c_str()), "type",
                              cJSON_CreateString("IEEE 1588-2008"));
    cJSON_ReplaceItemInObjectCaseSensitive(many, "timeReferences", references);
    char* text = cJSON_PrintUnformatted(many);
    gSim->replaceState(text);
    cJSON_free(text);
    cJSON_Delete(many);
    body();
    gSim->replaceState(saved);
}

void SessionGetTimeReferenceNames100k(benchmark::State& state) {
    ViSession vi = 0;
    if (tiktal_init(gSim->resource().c_str(), VI_FALSE, VI_FALSE, &vi) != VI_SUCCESS) {
        state.SkipWithError("tiktal_init failed");
        return;
    }
    std::vector<ViChar> names(4 << 20);
    withManyReferences([&] {
        onOneConnection(state, [&] {
            for (auto _ : state)
                benchmark::DoNotOptimize(tiktal_GetTimeReferenceNames(vi, static_cast<ViInt32>(names.size()), names.data()));
        });
    });
    tiktal_close(vi);
}

// The same request as SessionGetTimeReferenceNames100k sends.
void PlainLibcurlNames100k(benchmark::State& state) {
    withManyReferences([&] { plainGets(state, {"sync_1?attribute=allTimeReferences"}); });
}

BENCHMARK(TransportGet)->UseRealTime();
BENCHMARK(PlainLibcurlGet)->UseRealTime();
BENCHMARK(SessionGetAttributeViInt32)->UseRealTime();
BENCHMARK(PlainLibcurlTypeThenValue)->UseRealTime();
BENCHMARK(SessionGetTimeReferenceNames100k)->UseRealTime()->Unit(benchmark::kMillisecond);
BENCHMARK(PlainLibcurlNames100k)->UseRealTime()->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv) {
    setenv("ZRSHAREDDIR", TIKTAL_SHARED_DIR_BUILD, 0);
    gSim = std::make_unique<TimeServiceSim>();
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    gSim.reset();
    return 0;
}
