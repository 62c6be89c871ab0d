#include "fx/class_scores.h"

#include <algorithm>

#include <fmt/format.h>

#include "commands/share_file.h"
#include "foundation/fault.h"
#include "tasks/parallel.h"

namespace lumo {
bool ClassScoresCommand::OpenFiles(bool withStatistics) {
  if (!columns_.Open(Read<Array<String>>("AttributesFXA"))) return false;
  return !withStatistics || columns_.OpenStatistics(Read<Array<String>>("StatsFXAS"));
}

bool ClassScoresCommand::ChooseAttributes() {
  const auto rows = Read<Array<unsigned>>("AttributeDefinition");
  constexpr unsigned kColumns = 3;
  if (!rows.IsValid() || rows.GetCount() == 0 || rows.GetCount() % kColumns != 0) {
    return Refuse("AttributeDefinition: the numbers are no rows of 3");
  }
  std::vector<AttributeChoice> choices;
  for (unsigned i = 0; i < rows.GetCount(); i += kColumns) {
    choices.push_back({rows[i], rows[i + 1], rows[i + 2]});
  }
  return columns_.Choose(std::move(choices), "AttributeDefinition");
}

bool ClassScoresCommand::ReadExamples() {
  const auto rows = Read<Array<unsigned>>("ExampleDefinition");
  const unsigned width = rows.GetRank() >= 2 ? rows.GetExtent(rows.GetRank() - 1) : 2;
  if (!rows.IsValid() || rows.GetCount() == 0 || width < 2 || rows.GetCount() % width != 0) {
    return Refuse("ExampleDefinition: the numbers are no rows of class and region");
  }
  constexpr unsigned kMostClasses = 65535;  // attributes of a file
  const unsigned regions = columns_.RegionCount();
  for (unsigned i = 0; i < rows.GetCount(); i += width) {
    const ClassExample example{rows[i], rows[i + 1]};
    const std::string row = "ExampleDefinition: row " + std::to_string(i / width) + ": ";
    if (example.classIndex >= kMostClasses) {
      return Refuse(row + "class " + std::to_string(example.classIndex) + " is above 65534");
    }
    if (example.region >= regions) {
      return Refuse(row + "there is no region " + std::to_string(example.region) + ", only " +
                    std::to_string(regions));
    }
    examples_.push_back(example);
    classCount_ = std::max(classCount_, example.classIndex + 1);
  }
  return true;
}

bool ClassScoresCommand::CreateScores(unsigned classes) {
  classCount_ = classes;
  if (IsShare()) return true;
  URI uri;
  if (!TakeOutput("ClassFXC", uri)) return false;
  scores_ = std::make_unique<RegionClassificationProbabilityFile>(uri, classes);
  return scores_->IsValid();
}

bool ClassScoresCommand::ScoreRegions(const std::vector<unsigned>& regions,
                                      const ScoreBlock& score) {
  if (IsShare()) return MakeShare(regions, score);
  if (Joins()) return TakeShares(regions);
  const auto store = [this](const unsigned* of, unsigned count, const float* scores) {
    for (unsigned i = 0; i < count; ++i) {
      for (unsigned c = 0; c < classCount_; ++c) scores_->Value(of[i], 0, c) = *scores++;
    }
  };
  return ScoreBlocks(regions.data(), regions.size(), score, store) && scores_->IsValid();
}

bool ClassScoresCommand::ScoreBlocks(const unsigned* regions, std::size_t all,
                                     const ScoreBlock& score, const Store& store) {
  constexpr std::size_t kBlock = 8192;
  constexpr unsigned kPart = 256;
  std::vector<double> values(kBlock * columns_.Count()), scores(kBlock * classCount_);
  for (std::size_t begin = 0; begin < all; begin += kBlock) {
    const auto count = static_cast<unsigned>(std::min(kBlock, all - begin));
    const unsigned parts = (count + kPart - 1) / kPart;
    for (unsigned part = 0; part < parts; ++part) {
      const unsigned first = part * kPart, length = std::min(kPart, count - first);
      double* const to = values.data() + std::size_t{first} * columns_.Count();
      columns_.Read(regions + begin + first, length, to);
    }
    std::fill(scores.begin(), scores.end(), 0.0);
    ParallelFor(parts, nullptr, [&](unsigned part) {
      const unsigned first = part * kPart, length = std::min(kPart, count - first);
      score(regions + begin + first, length, values.data() + std::size_t{first} * columns_.Count(),
            scores.data() + std::size_t{first} * classCount_);
    });
    const auto end = scores.begin() + static_cast<std::ptrdiff_t>(std::size_t{count} * classCount_);
    const std::vector<float> rounded(scores.begin(), end);
    store(regions + begin, count, rounded.data());
    GetIPC().progress->Update(static_cast<double>(begin + count) / static_cast<double>(all));
    if (GetIPC().abort->IsSet()) return Refuse("the work was aborted");
  }
  return true;
}

std::string ClassScoresCommand::KeyOfShares(const std::vector<unsigned>& regions) const {
  return fmt::format("class scores {} {} {} {}", columns_.RegionCount(), columns_.Count(),
                     classCount_, regions.size());
}

bool ClassScoresCommand::MakeShare(const std::vector<unsigned>& regions, const ScoreBlock& score) {
  Share share;
  if (!ReadShare(Read<Array<unsigned>>(kShareInput), share)) return false;
  const std::string file = Read<String>(kShareFileInput).ToUTF8();
  if (file.empty() || Joins()) {
    return Refuse("Share goes with ShareFile, and not with ShareFiles");
  }
  ShareWriter out;
  const auto store = [&](const unsigned*, unsigned count, const float* scores) {
    out.PutAll(scores, std::size_t{count} * classCount_);
  };
  const std::size_t first = share.Begin(regions.size()), end = share.End(regions.size());
  return ScoreBlocks(regions.data() + first, end - first, score, store) &&
         out.Write(file, KeyOfShares(regions), share);
}

bool ClassScoresCommand::TakeShares(const std::vector<unsigned>& regions) {
  const auto files = Read<Array<String>>(kShareFilesInput);
  std::vector<float> scores(classCount_);
  for (unsigned i = 0; i < files.GetCount(); ++i) {
    const Share share{i, files.GetCount()};
    const std::string file = files[i].ToUTF8();
    ShareReader in;
    if (!in.Open(file, KeyOfShares(regions), share)) return false;
    const std::size_t end = share.End(regions.size());
    for (std::size_t region = share.Begin(regions.size()); region < end; ++region) {
      if (!in.GetAll(scores.data(), scores.size())) {
        SetShareFault(file);
        return false;
      }
      for (unsigned c = 0; c < classCount_; ++c) scores_->Value(regions[region], 0, c) = scores[c];
    }
    if (!in.IsAtEnd()) {
      SetShareFault(file);
      return false;
    }
  }
  return scores_->IsValid();
}

CommandResult ClassScoresCommand::Finish(bool isDone) {
  if (isDone && (IsShare() || scores_->Close())) return Succeed();
  return Fail(TakeFaultOr("the scores can't be written"));
}

InputDeclaration ExamplesInput() {
  return {"ExampleDefinition", Presence::kRequired, ValueKind::kIntegerArray,
          "rows of class and region, each an example"};
}

InputDeclaration ChoicesInput() {
  return {"AttributeDefinition", Presence::kRequired, ValueKind::kIntegerArray,
          "rows of file, attribute and band"};
}

InputDeclaration AttributesInput() {
  return {"AttributesFXA", Presence::kRequired, ValueKind::kTextList, "the files of regions"};
}

InputDeclaration StatisticsInput() {
  return {"StatsFXAS", Presence::kRequired, ValueKind::kTextList,
          "the files of their statistics, in the same order"};
}

InputDeclaration ScoresInput() {
  return {"ClassFXC", Presence::kRequired, ValueKind::kText,
          "the file to create, with a score of each region for each class"};
}

}  // namespace lumo
