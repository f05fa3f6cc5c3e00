// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/ffmpeg/FilterChain.h"

extern "C" {
#include <libavfilter/buffersink.h>
#include <libavfilter/buffersrc.h>
}

#include <utility>

#include "quilt/platform/ffmpeg/Failure.h"

namespace quilt::platform::ffmpeg {

namespace {

bool isSound(const AVFrame& frame) { return frame.nb_samples > 0; }

// The list of open ends that the library's parser wants.
struct End {
  AVFilterInOut* list = avfilter_inout_alloc();
  End(const char* name, AVFilterContext* filter) {
    if (list != nullptr) *list = {.name = av_strdup(name), .filter_ctx = filter, .pad_idx = 0, .next = nullptr};
  }
  End(const End&) = delete;
  End& operator=(const End&) = delete;
  ~End() { avfilter_inout_free(&list); }
};

int setUpSource(AVFilterContext& source, const AVFrame& frame, AVRational timeBase) {
  AVBufferSrcParameters* parameters = av_buffersrc_parameters_alloc();
  if (parameters == nullptr) return AVERROR(ENOMEM);
  parameters->format = frame.format;
  parameters->time_base = timeBase;
  parameters->width = frame.width;
  parameters->height = frame.height;
  parameters->sample_rate = frame.sample_rate;
  int code = isSound(frame) ? av_channel_layout_copy(&parameters->ch_layout, &frame.ch_layout) : 0;
  if (code >= 0) code = av_buffersrc_parameters_set(&source, parameters);
  av_channel_layout_uninit(&parameters->ch_layout);
  av_free(parameters);
  return code < 0 ? code : avfilter_init_str(&source, nullptr);
}

}  // namespace

Result<FilterChain> FilterChain::create(const AVFrame& frame, AVRational timeBase, const std::string& filters,
                                        const std::filesystem::path& file) {
  FilterChain chain;
  chain._graph.reset(avfilter_graph_alloc());
  chain._model.reset(av_frame_alloc());
  if (!chain._graph || !chain._model) return failure(AVERROR(ENOMEM), file);
  chain._model->format = frame.format;
  chain._model->width = frame.width;
  chain._model->height = frame.height;
  chain._model->sample_rate = frame.sample_rate;
  chain._model->colorspace = frame.colorspace;
  chain._model->color_range = frame.color_range;
  chain._model->color_primaries = frame.color_primaries;
  chain._model->color_trc = frame.color_trc;
  int code = av_channel_layout_copy(&chain._model->ch_layout, &frame.ch_layout);
  if (code < 0) return failure(code, file);

  AVFilterGraph* graph = chain._graph.get();
  const bool sound = isSound(frame);
  chain._source = avfilter_graph_alloc_filter(graph, avfilter_get_by_name(sound ? "abuffer" : "buffer"), "in");
  chain._sink = avfilter_graph_alloc_filter(graph, avfilter_get_by_name(sound ? "abuffersink" : "buffersink"), "out");
  if (chain._source == nullptr || chain._sink == nullptr) return failure(AVERROR(ENOMEM), file);
  code = setUpSource(*chain._source, frame, timeBase);
  if (code >= 0) code = avfilter_init_str(chain._sink, nullptr);
  if (code < 0) return conversionFailure(code, file);

  End outputs("in", chain._source);
  End inputs("out", chain._sink);
  if (outputs.list == nullptr || inputs.list == nullptr) return failure(AVERROR(ENOMEM), file);
  const std::string row = filters.empty() ? (sound ? "anull" : "null") : filters;
  code = avfilter_graph_parse_ptr(graph, row.c_str(), &inputs.list, &outputs.list, nullptr);
  if (code >= 0) code = avfilter_graph_config(graph, nullptr);
  if (code < 0) return conversionFailure(code, file);
  return chain;
}

bool FilterChain::fits(const AVFrame& frame) const {
  return frame.format == _model->format && frame.width == _model->width && frame.height == _model->height &&
         frame.sample_rate == _model->sample_rate && frame.colorspace == _model->colorspace &&
         frame.color_range == _model->color_range && frame.color_primaries == _model->color_primaries &&
         frame.color_trc == _model->color_trc && av_channel_layout_compare(&frame.ch_layout, &_model->ch_layout) == 0;
}

int FilterChain::push(AVFrame* frame) { return av_buffersrc_add_frame_flags(_source, frame, AV_BUFFERSRC_FLAG_PUSH); }
int FilterChain::pull(AVFrame& frame) { return av_buffersink_get_frame(_sink, &frame); }
AVRational FilterChain::timeBase() const { return av_buffersink_get_time_base(_sink); }
void FilterChain::setFrameSize(int samples) { av_buffersink_set_frame_size(_sink, static_cast<unsigned>(samples)); }

}  // namespace quilt::platform::ffmpeg
