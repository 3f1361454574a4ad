// How the cost grows with the number of value blocks in a document.

#include "growth/growth.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

namespace {

constexpr char kValues[] = "107 1646 5006 5712 5936 6217 4324 458 473 518 549 589 623 386 221 68 "
                           "2173 5914 6154 5882 5767 4403 382 377 345 351 347 336 193 70";

using Tag = Owned<XMLTag, DisposeXMLTag>;

void add_block(XMLTag* blocks)
{
    XMLTag* const block = CreateXMLTagFromStr("FP_BLOCK", kValues);
    SetXMLTagAttrFromStr(block, "TYPE", "SIGNED_INT_16");
    SetXMLTagAttrFromInt(block, "COUNT", 30);
    SetXMLTagAttrFromStr(block, "ENCODING", "ASCII");
    SetXMLTagAttrFromStr(block, "SEPARATOR", " ");
    AddXMLSubTag(blocks, block);
}

void write_document(size_t count)
{
    const Tag root(CreateXMLTagFromStr("KZFPX_FP_QUERY", nullptr));
    XMLTag* const blocks = CreateXMLTagFromStr("FP_BLOCKS", nullptr);
    AddXMLSubTag(root.get(), blocks);
    for (size_t i = 0; i < count; ++i) {
        add_block(blocks);
    }
    const Owned<char, _kzmem_free> text(RenderXMLTagToStr(root.get(), 1));
    require(text != nullptr, "no document");
}

/// Seconds of processor time; the median of several runs; short ones are repeated.
double time_of(const std::function<void()>& run, size_t blocks)
{
    const size_t repetitions = std::max<size_t>(1, 100 / blocks);
    std::vector<double> times;
    for (int i = 0; i < 7; ++i) {
        times.push_back(cpu_seconds([&] {
                            for (size_t j = 0; j < repetitions; ++j) {
                                run();
                            }
                        }) /
                        static_cast<double>(repetitions));
    }
    return spread_of(times).median;
}

} // namespace

GrowthTable grow_document(bool /*thorough*/)
{
    GrowthTable table{"Near linear: ten times the blocks of 1000 take at most 12 times as long",
                      {"blocks", "ours", "ours, for a block", kPugixml, kTinyxml2, kLibxml2},
                      {},
                      true};
    double thousand = 0;
    for (const size_t blocks : {size_t{1}, size_t{10}, size_t{100}, size_t{1000}, size_t{10000}}) {
        const double time = time_of([&] { write_document(blocks); }, blocks);
        std::vector<std::string> row = {number(static_cast<double>(blocks)), in_time(time),
                                        in_time(time / static_cast<double>(blocks))};
        for (const Peer& peer :
             {document_by_pugixml(kValues, blocks), document_by_tinyxml2(kValues, blocks),
              document_by_libxml2(kValues, blocks)}) {
            row.push_back(
                peer.run ? in_time(time_of(peer.run, blocks) / static_cast<double>(blocks)) : "");
        }
        table.rows.push_back(std::move(row));
        thousand = blocks == 1000 ? time : thousand;
        table.holds = blocks != 10000 || time <= 12 * thousand;
    }
    return table;
}

} // namespace kz::bench
