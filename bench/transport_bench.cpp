// One GET round trip to the time-service simulator: through the transport (loaded HTTP library,
// envelope check and unwrapping) against a plain libcurl easy-handle loop on the same URL.
#include <benchmark/benchmark.h>
#include <curl/curl.h>

#include <cstdlib>
#include <memory>
#include <string>

#include "client/curl.h"
#include "timeservice_sim.h"

namespace {

std::unique_ptr<TimeServiceSim> gSim;
constexpr char kPath[] = "sync_1?attribute=epochOffsetInNsec";

void TransportGet(benchmark::State& state) {
    zr::vantle::shared::tCURL curl;
    curl.initialize("http://" + gSim->host(), "tiktalwebs", 5000);
    curl.setMediaType("vnd.zr.tiktal.v1/json; charset=utf-8");
    for (auto _ : state) benchmark::DoNotOptimize(curl.get(kPath));
}

size_t collect(char* data, size_t size, size_t count, void* user) {
    static_cast<std::string*>(user)->append(data, size * count);
    return size * count;
}

void PlainLibcurlGet(benchmark::State& state) {
    CURL* handle = curl_easy_init();
    curl_slist* headers = curl_slist_append(nullptr, "Accept: vnd.zr.tiktal.v1/json; charset=utf-8");
    headers = curl_slist_append(headers, "Content-Type: vnd.zr.tiktal.v1/json; charset=utf-8");
    const std::string url = gSim->url(std::string("/tiktalwebs/") + kPath);
    std::string body;
    curl_easy_setopt(handle, CURLOPT_URL, url.c_str());
    curl_easy_setopt(handle, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, collect);
    curl_easy_setopt(handle, CURLOPT_WRITEDATA, &body);
    curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
    for (auto _ : state) {
        body.clear();
        curl_easy_perform(handle);
        benchmark::DoNotOptimize(body);
    }
    curl_slist_free_all(headers);
    curl_easy_cleanup(handle);
}

BENCHMARK(TransportGet)->UseRealTime();
BENCHMARK(PlainLibcurlGet)->UseRealTime();

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
