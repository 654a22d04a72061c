// Who is cut off, in words and against a model that remembers everything.
#include "planes/openvswitch/beacons/hearing.h"

#include <gmock/gmock.h>

#include <random>
#include <set>
#include <string>
#include <vector>

namespace {

using simhost::beacons::Hearing;
using simhost::beacons::Link;
using Links = std::set<Link>;
using testing::Optional;

constexpr int kEnough = 4;  // rounds

// In which links hear each other within these parts, and nobody beyond.
void pass_rounds(Hearing &hearing, std::vector<Links> const &parts, int rounds = kEnough) {
  for (int round = 0; round < rounds; ++round) {
    hearing.begin_round();
    for (auto const &part : parts) {
      for (auto const at : part) {
        for (auto const from : part) {
          hearing.hear(at, from);
        }
      }
    }
  }
}

struct Three : testing::Test {
  Three() { hearing.follow({1, 2, 3}); }

  Hearing hearing;
};

TEST_F(Three, AreUndecidedBeforeTheyHadTimeToHear) {
  EXPECT_EQ(hearing.is_cut_off(1), std::nullopt);
  pass_rounds(hearing, {{2, 3}}, 1);
  EXPECT_EQ(hearing.is_cut_off(1), std::nullopt);
  EXPECT_THAT(hearing.is_cut_off(2), Optional(false)) << "it has heard";
}

TEST_F(Three, LoseTheOneThatNobodyHears) {
  pass_rounds(hearing, {{1, 2, 3}});
  EXPECT_THAT(hearing.is_cut_off(1), Optional(false));
  pass_rounds(hearing, {{2, 3}});
  EXPECT_THAT(hearing.is_cut_off(1), Optional(true));
  EXPECT_THAT(hearing.is_cut_off(2), Optional(false));
  EXPECT_THAT(hearing.is_cut_off(3), Optional(false));
  pass_rounds(hearing, {{1, 2, 3}}, 1);
  EXPECT_THAT(hearing.is_cut_off(1), Optional(false)) << "it is back at once";
}

TEST_F(Three, BearThatBeaconsAreLost) {
  pass_rounds(hearing, {{1, 2, 3}});
  pass_rounds(hearing, {{2, 3}}, 3);
  EXPECT_THAT(hearing.is_cut_off(1), Optional(false));
}

TEST_F(Three, ThatHearNobodyAreNotToldApart) {
  pass_rounds(hearing, {{1, 2, 3}});
  pass_rounds(hearing, {});
  for (Link const link : {1, 2, 3}) {
    EXPECT_THAT(hearing.is_cut_off(link), Optional(false));
  }
}

TEST_F(Three, LoseTheOneThatIsHeardAndHearsNothing) {
  for (int round = 0; round < kEnough; ++round) {
    pass_rounds(hearing, {{2, 3}}, 1);
    hearing.hear(2, 1);
    hearing.hear(3, 1);
  }
  EXPECT_THAT(hearing.is_cut_off(1), Optional(true));
}

TEST_F(Three, KnowNothingOfOthers) {
  EXPECT_EQ(hearing.is_cut_off(4), std::nullopt);
  pass_rounds(hearing, {{2, 3, 4}});
  hearing.follow({1, 2, 4});
  EXPECT_EQ(hearing.is_cut_off(4), std::nullopt) << "what was no link was not heard";
  EXPECT_THAT(hearing.is_cut_off(1), Optional(false)) << "nobody hears another any more";
}

TEST(TwoLinks, AreNeverToldApart) {
  Hearing hearing;
  hearing.follow({1, 2});
  pass_rounds(hearing, {{1, 2}});
  pass_rounds(hearing, {});
  EXPECT_THAT(hearing.is_cut_off(1), Optional(false));
  EXPECT_THAT(hearing.is_cut_off(2), Optional(false));
}

TEST(FourLinks, InTwoHalvesAllStayInUse) {
  Hearing hearing;
  hearing.follow({1, 2, 3, 4});
  pass_rounds(hearing, {{1, 2}, {3, 4}});
  for (Link const link : {1, 2, 3, 4}) {
    EXPECT_THAT(hearing.is_cut_off(link), Optional(false));
  }
}

// Everything that was ever said, looked through anew for each question.
class Model {
 public:
  void follow(Links const &links) {
    for (auto const link : links) {
      if (!links_.contains(link)) {
        said_.push_back({.round = round_, .at = link, .from = link, .is_joining = true});
      }
    }
    for (auto const link : links_) {
      if (!links.contains(link)) {
        std::erase_if(said_, [&](Said const &one) { return one.at == link || one.from == link; });
      }
    }
    links_ = links;
  }
  void hear(Link at, Link from) {
    if (links_.contains(at) && links_.contains(from) && at != from) {
      said_.push_back({.round = round_, .at = at, .from = from, .is_joining = false});
    }
  }
  void begin_round() { ++round_; }
  std::optional<bool> is_cut_off(Link link) const {
    if (!links_.contains(link)) {
      return std::nullopt;
    }
    bool has_pair = false;
    for (auto const one : links_) {
      for (auto const other : links_) {
        if (heard(one, other) && heard(other, one)) {
          if (one == link) {
            return false;
          }
          has_pair = true;
        }
      }
    }
    for (auto const &one : said_) {
      if (one.is_joining && one.at == link && one.round + 3 >= round_) {
        return std::nullopt;
      }
    }
    return has_pair;
  }

 private:
  struct Said {
    int round;
    Link at;
    Link from;
    bool is_joining;
  };
  bool heard(Link at, Link from) const {
    for (auto const &one : said_) {
      if (!one.is_joining && one.at == at && one.from == from && one.round + 3 >= round_) {
        return true;
      }
    }
    return false;
  }

  int round_ = 0;
  Links links_;
  std::vector<Said> said_;
};

TEST(Links, AreToldApartAsAModelTellsThem) {
  constexpr Link kMost = 6;
  for (unsigned seed = 0; seed < 200; ++seed) {
    std::mt19937 random(seed);
    auto const below = [&](unsigned bound) { return random() % bound; };
    Hearing hearing;
    Model model;
    for (int step = 0; step < 100; ++step) {
      switch (auto const what = below(8); what) {
        case 0: {
          Links links;
          for (Link link = 0; link < kMost; ++link) {
            if (below(4) != 0) {
              links.insert(link);
            }
          }
          hearing.follow(links);
          model.follow(links);
          break;
        }
        case 1:
        case 2:
          hearing.begin_round();
          model.begin_round();
          break;
        default: {
          auto const at = below(kMost);
          auto const from = below(kMost);
          hearing.hear(at, from);
          model.hear(at, from);
        }
      }
      for (Link link = 0; link < kMost; ++link) {
        ASSERT_EQ(hearing.is_cut_off(link), model.is_cut_off(link))
            << "link " << link << ", seed " << seed << ", step " << step;
      }
    }
  }
}

}  // namespace
