// SPDX-License-Identifier: Apache-2.0
//
// A camera that responds to an HTTP request with Motion JPEG as an endless multipart body.
#include "standalone/base/clock.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/libav.h"
#include "standalone/media/multipart_reader.h"
#include "standalone/media/source_kinds.h"
#include "standalone/media/source_url.h"

extern "C" {
#include <libavutil/mem.h>
#include <libavutil/opt.h>
}

namespace lookhaven::media {

namespace {

constexpr const char* kMaxRedirects = "3";

class MjpegHttpSource : public Source {
  public:
    MjpegHttpSource(const std::string& url, const SourceOptions& options, std::stop_token stop)
        : deadline_(std::move(stop), options.no_data_limit),
          connection_(Connect(url, options)),
          reader_(Boundary(), base::kMaxFrameBytes,
                  [this](std::span<std::uint8_t> buffer) { return Receive(buffer); }) {}

    const std::optional<StreamFormat>& Audio() const override { return audio_; }

    Packet Next() override {
        for (;;) {
            const std::span<const std::uint8_t> frame = reader_.Next();
            const std::optional<PictureSize> size = JpegSize(frame);
            if (size) {
                deadline_.Rearm();
                video_.width = size->width;
                video_.height = size->height;
                return {Medium::kVideo, frame, base::MonotonicMicros(), true, &video_};
            }
        }
    }

  private:
    AvPtr<AVIOContext> Connect(const std::string& url, const SourceOptions& options) {
        AvOptions av_options;
        av_options.Set("protocol_whitelist", "http,https,tls,tcp")
            .Set("user_agent", "lookhaven")
            .Set("max_redirects", kMaxRedirects)
            .Set("tls_verify", options.insecure ? "0" : "1");
        // Cameras are reached directly, whatever proxy the environment names.
        av_options.Set("http_proxy", "none");
        AVIOContext* connection = nullptr;
        const AVIOInterruptCB interrupt = deadline_.Callback();
        TakeCertificateProblem();  // of an earlier camera
        const int opened = avio_open2(&connection, WithCredentials(url, options.credentials).c_str(), AVIO_FLAG_READ,
                                      &interrupt, av_options.Get());
        if (opened < 0) {
            deadline_.Check();
            if (const std::string problem = TakeCertificateProblem(); !problem.empty()) {
                throw SourceError("its TLS certificate is refused (" + problem +
                                      "): have an authority that this machine trusts sign it, or accept any certificate"
                                      " of this camera with --insecure",
                                  base::SignalLoss::kCertificate);
            }
            CheckAv(opened, "cannot open");
        }
        return AvPtr<AVIOContext>(connection);
    }

    std::string Boundary() const {
        std::uint8_t* content_type = nullptr;
        av_opt_get(connection_.get(), "mime_type", AV_OPT_SEARCH_CHILDREN, &content_type);
        const std::string text = content_type != nullptr ? reinterpret_cast<const char*>(content_type) : "";
        av_free(content_type);
        const std::string boundary = BoundaryOf(text);
        if (boundary.empty()) {
            throw SourceError("does not answer with Motion JPEG");
        }
        return boundary;
    }

    std::size_t Receive(std::span<std::uint8_t> buffer) {
        deadline_.Check();
        const int received = avio_read_partial(connection_.get(), buffer.data(), static_cast<int>(buffer.size()));
        deadline_.Check();
        if (received == 0 || received == AVERROR_EOF) {
            throw SourceError("the camera ended the stream");
        }
        return static_cast<std::size_t>(CheckAv(received, "cannot read on"));
    }

    Deadline deadline_;
    AvPtr<AVIOContext> connection_;
    MultipartReader reader_;
    StreamFormat video_;
    std::optional<StreamFormat> audio_;
};

}  // namespace

std::unique_ptr<Source> OpenMjpegHttp(const std::string& url, const SourceOptions& options, std::stop_token stop) {
    return std::make_unique<MjpegHttpSource>(url, options, std::move(stop));
}

}  // namespace lookhaven::media
