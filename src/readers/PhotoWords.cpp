// SPDX-License-Identifier: Apache-2.0
#include "readers/PhotoWords.h"

#include <array>
#include <string>
#include <unordered_map>

#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

struct PhotoRow {
    std::string_view meaning;
    std::string_view words;  ///< Apart by blanks; a blank within a word is written as a hyphen.
};

// Each word itself is a row's first; then English, German, French, Spanish, Italian, Dutch.
constexpr auto kInferences = std::to_array<PhotoRow>({
    {"baby",
     "baby babies newborn infant toddler säugling kleinkind neugeborenes bébé nourrisson "
     "nouveau-né bebé recién-nacido neonato bambino-piccolo bimbo zuigeling pasgeborene"},
    {"pet",
     "pet pets dog dogs puppy cat cats kitten haustier haustiere hund hunde welpe katze katzen "
     "kätzchen animal-de-compagnie chien chiens chiot chat chats chaton mascota mascotas perro "
     "perros cachorro gato gatos animale-domestico cane cani cucciolo gatto gatti gattino huisdier "
     "huisdieren hond honden kat katten"},
    {"trip",
     "trip travel traveling travelling journey vacation vacations holidays road-trip roadtrip "
     "city-trip reise reisen urlaub ausflug städtereise voyage voyages vacances excursion viaje "
     "viajes vacaciones excursión viaggio viaggi vacanza vacanze gita reis reizen vakantie uitstap "
     "stedentrip"},
    {"nature",
     "nature landscape wildlife forest wood woods lake river waterfall meadow natur landschaft "
     "wald fluss wasserfall wiese paysage forêt lac rivière cascade naturaleza paisaje bosque "
     "lago río cascada natura paesaggio bosco foresta fiume cascata natuur landschap bos "
     "rivier waterval"},
    {"mountain",
     "mountain mountains summit peak alps alpine berg berge gebirge gipfel alpen montagne "
     "montagnes sommet alpes montaña montañas cumbre sierra montagna montagne vetta alpi bergen "
     "gebergte bergtop"},
    {"beach",
     "beach beaches seaside seashore coast strand strände küste plage plages bord-de-mer "
     "playa playas costa spiaggia spiagge stranden kust"},
    {"home",
     "home house-and-home at-home zuhause daheim zu-hause maison à-la-maison chez-moi hogar "
     "en-casa casa a-casa thuis"},
    {"work",
     "work office workplace job arbeit büro arbeitsplatz travail bureau trabajo oficina lavoro "
     "ufficio werk kantoor"},
    {"frequentLocation", "frequent-location favourite-place favorite-place lieblingsort"},
    {"Activity",
     "activity activities sport sports exercise workout aktivität aktivitäten training activité "
     "activités actividad deporte ejercicio attività allenamento activiteit oefening"},
    {"Hiking",
     "hiking hike hikes trekking trek wandern wanderung bergwandern bergtour randonnée "
     "randonnées senderismo caminata excursionismo escursionismo escursione trekking wandelen "
     "bergwandeling wandeltocht"},
    {"Climbing",
     "climbing rock-climbing bouldering mountaineering via-ferrata klettern klettersteig "
     "bergsteigen bouldern escalade alpinisme escalada alpinismo alpinismo arrampicata klimmen "
     "bergbeklimmen"},
    {"Beaching",
     "beaching beach-day sunbathing day-at-the-beach strandtag sonnenbaden journée-plage "
     "bronzage día-de-playa giornata-al-mare stranddag zonnebaden"},
    {"Diving",
     "diving dive scuba scuba-diving snorkeling snorkelling tauchen tauchgang schnorcheln plongée "
     "plongée-sous-marine buceo submarinismo immersione immersioni duiken snorkelen"},
    {"WinterSport",
     "winter-sport winter-sports ski skiing snowboard snowboarding ice-skating "
     "cross-country-skiing "
     "sledding wintersport skifahren langlauf eislaufen rodeln schlittschuhlaufen sport-d'hiver "
     "sports-d'hiver patinage luge esquí esquiar deportes-de-invierno patinaje-sobre-hielo sci "
     "sciare sport-invernali pattinaggio skiën schaatsen langlaufen"},
    {"Entertainment",
     "entertainment show cinema movies unterhaltung kino divertissement spectacle cinéma "
     "entretenimiento espectáculo cine intrattenimento spettacolo vermaak bioscoop"},
    {"AmusementPark",
     "amusement-park theme-park funfair fairground roller-coaster vergnügungspark freizeitpark "
     "jahrmarkt kirmes parc-d'attractions fête-foraine parque-de-atracciones parque-temático "
     "parco-divertimenti luna-park pretpark attractiepark kermis"},
    {"Performance",
     "performance stage-performance recital circus aufführung auftritt zirkus représentation "
     "cirque actuación circo esibizione rappresentazione optreden voorstelling"},
    {"Concert",
     "concert concerts gig live-music konzert konzerte live-musik musique-live concierto "
     "conciertos música-en-vivo concerto concerti musica-dal-vivo concerten"},
    {"Festival",
     "festival festivals music-festival musikfestival volksfest festival-de-musique "
     "feria festivales sagra muziekfestival"},
    {"Theater", "theater theatre opera musical oper théâtre opéra teatro ópera schouwburg"},
    {"Dance",
     "dance dancing ballet tanz tanzen ballett danse danser baile bailar danza "
     "ballo ballare balletto dans dansen"},
    {"SportEvent",
     "sport-event sports-event sporting-event football-match soccer-match marathon "
     "tournament sportveranstaltung fussballspiel wettkampf turnier événement-sportif "
     "match-de-foot tournoi evento-deportivo partido torneo evento-sportivo partita "
     "sportevenement wedstrijd toernooi"},
    {"NightOut",
     "night-out nightlife night-club nightclub party-night nachtleben ausgehen abend-unterwegs "
     "sortie-nocturne vie-nocturne soirée noche-de-fiesta vida-nocturna vita-notturna "
     "serata-fuori avondje-uit uitgaan nachtleven"},
    {"Museum",
     "museum museums gallery art-gallery exhibition museen ausstellung galerie musée "
     "musées exposition museo museos exposición galería musei mostra galleria musea "
     "tentoonstelling"},
    {"Celebration",
     "celebration party feast feier fest fete fête fêtes célébration celebración fiesta "
     "celebrazione festa viering feest graduation baptism taufe"},
    {"Birthday",
     "birthday birthdays birthday-party geburtstag geburtstage geburtstagsfeier geburtstagsparty "
     "anniversaire fête-d'anniversaire cumpleaños fiesta-de-cumpleaños compleanno "
     "festa-di-compleanno verjaardag verjaardagsfeest"},
    {"Anniversary",
     "anniversary wedding-anniversary jubilee jahrestag hochzeitstag jubiläum "
     "anniversaire-de-mariage noces-d'or aniversario aniversario-de-boda anniversario "
     "anniversario-di-matrimonio jubileum trouwdag huwelijksverjaardag"},
    {"Wedding",
     "wedding weddings marriage bride hochzeit trauung mariage noces boda casamiento "
     "matrimonio nozze bruiloft huwelijk"},
    {"HolidayEvent",
     "holiday-event holiday feiertag feiertage jour-férié día-festivo festivo "
     "giorno-festivo feestdag feestdagen"},
    {"Gathering",
     "gathering family-gathering get-together reunion family-reunion meeting-friends barbecue "
     "bbq picnic treffen familientreffen familienfeier grillen picknick réunion-de-famille "
     "retrouvailles pique-nique reunión-familiar barbacoa raduno riunione-di-famiglia grigliata "
     "bijeenkomst familiebijeenkomst"},
});

constexpr auto kHolidays = std::to_array<PhotoRow>({
    {"Christmas",
     "christmas xmas christmas-day weihnachten weihnachtsfest noël navidad natale "
     "kerst kerstmis"},
    {"Christmas Eve",
     "christmas-eve heiligabend heiliger-abend réveillon-de-noël nochebuena "
     "vigilia-di-natale kerstavond"},
    {"New Year's Eve",
     "new-year's-eve nye silvester saint-sylvestre nochevieja capodanno "
     "san-silvestro oudejaarsavond oud-en-nieuw"},
    {"New Year's Day",
     "new-year new-years new-year's-day neujahr nouvel-an jour-de-l'an año-nuevo "
     "nieuwjaar"},
    {"Easter", "easter easter-sunday ostern ostersonntag pâques pascua pasqua pasen"},
    {"Halloween", "halloween"},
    {"Thanksgiving", "thanksgiving thanksgiving-day action-de-grâce día-de-acción-de-gracias"},
    {"Valentine's Day",
     "valentine's-day valentines valentinstag saint-valentin san-valentín "
     "san-valentino valentijnsdag"},
    {"Mother's Day",
     "mother's-day mothers-day muttertag fête-des-mères día-de-la-madre "
     "festa-della-mamma moederdag"},
    {"Father's Day",
     "father's-day fathers-day vatertag fête-des-pères día-del-padre "
     "festa-del-papà vaderdag"},
    {"Carnival", "carnival mardi-gras karneval fasching fastnacht carnaval carnevale"},
    {"Hanukkah", "hanukkah chanukah chanukka hanoucca janucá chanoeka"},
    {"Diwali", "diwali deepavali"},
    {"Eid al-Fitr", "eid eid-al-fitr zuckerfest aïd-el-fitr suikerfeest"},
    {"Lunar New Year",
     "lunar-new-year chinese-new-year chinesisches-neujahr nouvel-an-chinois "
     "año-nuevo-chino capodanno-cinese chinees-nieuwjaar"},
    {"Saint Nicholas Day", "saint-nicholas-day nikolaus nikolaustag saint-nicolas sinterklaas"},
});

using MeaningTable = std::unordered_map<std::string, std::string_view>;

MeaningTable tableOf(std::span<const PhotoRow> rows) {
    MeaningTable table;
    for (const auto& row : rows) {
        for (auto& word : foldedWords(row.words)) table.try_emplace(std::move(word), row.meaning);
    }
    return table;
}

std::optional<std::string_view> lookUp(const MeaningTable& table, std::string_view keyword) {
    const auto found = table.find(foldWord(keyword));
    return found == table.end() ? std::nullopt : std::optional(found->second);
}

}  // namespace

std::optional<std::string_view> inferenceOfKeyword(std::string_view keyword) {
    static const MeaningTable table = tableOf(kInferences);
    if (const auto inference = lookUp(table, keyword)) return inference;
    return holidayOfKeyword(keyword) ? std::optional(kInferenceHolidayEvent) : std::nullopt;
}

std::optional<std::string_view> holidayOfKeyword(std::string_view keyword) {
    static const MeaningTable table = tableOf(kHolidays);
    return lookUp(table, keyword);
}

}  // namespace keepsakes
